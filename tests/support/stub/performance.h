// Performs the steps of a plan.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "support/stub/command_line.h"
#include "support/stub/plan_choice.h"

namespace vela_test {

/// Performs the plan of one call.
class Performance {
 public:
  /// `beforeEnd` is called before the process ends itself by a signal.
  Performance(const StubCommandLine& line, std::function<void()> beforeEnd);

  /// Performs all steps up to the end or an Exit; returns the exit status: that of the Exit or of
  /// the last program run, 1 when an output could not be written, else 0.
  int Perform(const std::vector<PlannedStep>& steps);

 private:
  enum class Progress { kGoOn, kEnd };

  Progress PerformStep(const PlannedStep& step);
  bool PerformOutputStep(const PlannedStep& step);
  bool PerformFileStep(const PlannedStep& step);
  bool PerformProcessStep(const PlannedStep& step);
  void WriteNextOutputs(size_t count, const std::function<std::string(const StubOutput&)>& content);
  void Print(int descriptor, const std::string& text, size_t times);
  std::string Resolved(const std::string& path) const;
  void Must(int error, const PlannedStep& step);
  void Fault(const std::string& problem);

  const StubCommandLine& line_;
  std::function<void()> beforeEnd_;
  size_t nextOutput_ = 0;
  int status_ = 0;
};

}  // namespace vela_test
