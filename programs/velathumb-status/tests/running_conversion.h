// A velathumb that runs as long as a test requires.
#pragma once

#include <sys/types.h>

#include <memory>

#include "support/program.h"
#include "support/stub_tool.h"

namespace vela_test {

/// Its converter waits while it processes the only photo; both end with the object.
class RunningConversion {
 public:
  RunningConversion();

  pid_t Pid() const { return program_->Pid(); }

  /// Lets the converter continue and waits for the end of the run; nothing is queued afterwards.
  void Finish();

 private:
  StubTool converter_;
  std::unique_ptr<Program> program_;
};

}  // namespace vela_test
