// A velathumb that is at work for as long as a test wants.
#pragma once

#include <sys/types.h>

#include <memory>

#include "support/program.h"
#include "support/stub_tool.h"

namespace vela_test {

/// Started with a converter that waits with the one photo there is; ended with its object.
class RunningConversion {
 public:
  RunningConversion();

  pid_t Pid() const { return program_->Pid(); }

  /// Lets the converter go on and waits for the end of the run.
  void Finish();

 private:
  StubTool converter_;
  std::unique_ptr<Program> program_;
};

}  // namespace vela_test
