// What a stub tool does when it is called: steps in order, written by the test beforehand.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

namespace vela_test {

/// One step: a word and its operands.
struct StubStep {
  std::string word;
  std::vector<std::string> operands;
};

/// The steps of one call, built one behind the other:
///   StubPlan().WriteOutputs(1).AppendToSource(100000).WriteOutputs().Exit(3)
/// A plan ends with exit status 0 (or that of its last Run or PassThrough) unless it says
/// otherwise; an empty plan does nothing at all. The outputs are those of the converter's command
/// line: the argument after each "-write", then the last argument. Where a step takes a path,
/// kSource stands for the photo (the input argument without "[0]") and kOutputDirectory for the
/// directory of the first output.
class StubPlan {
 public:
  static constexpr const char* kSource = "{source}";
  static constexpr const char* kOutputDirectory = "{output directory}";
  static constexpr size_t kAll = static_cast<size_t>(-1);

  /// A converter that works: all outputs, status 0.
  static StubPlan Normal() { return StubPlan().WriteOutputs(); }

  /// Writes the next `count` outputs, each a small whole grey JPEG of its "-thumbnail" box.
  StubPlan& WriteOutputs(size_t count = kAll);
  /// Writes the next `count` outputs with exactly `bytes` bytes each (a JPEG's beginning).
  StubPlan& WriteOutputsOfSize(size_t count, size_t bytes);
  /// Writes the next output with this content.
  StubPlan& WriteOutput(const std::string& content);
  /// Leaves out the next `count` outputs.
  StubPlan& SkipOutputs(size_t count = 1);

  StubPlan& Print(const std::string& bytes);       ///< to standard output
  StubPlan& PrintError(const std::string& bytes);  ///< to standard error
  /// `times` times the text, to standard output / standard error.
  StubPlan& PrintRepeated(const std::string& text, size_t times);
  StubPlan& PrintErrorRepeated(const std::string& text, size_t times);

  StubPlan& Sleep(int milliseconds);
  StubPlan& CreateFile(const std::string& path);   ///< empty; tells the test "I am here"
  StubPlan& WaitForFile(const std::string& path);  ///< "go on"; gives up after 60 s, status 125
  StubPlan& WriteFile(const std::string& path, const std::string& content);

  StubPlan& AppendToFile(const std::string& path, size_t bytes);    ///< size and blocks grow
  StubPlan& GrowSizeOnly(const std::string& path, size_t bytes);    ///< a hole: blocks stay
  StubPlan& GrowBlocksOnly(const std::string& path, size_t bytes);  ///< space beyond the end
  StubPlan& AppendToSource(size_t bytes) { return AppendToFile(kSource, bytes); }
  StubPlan& Remove(const std::string& path);  ///< a file or a whole tree
  StubPlan& ReplaceByDirectory(const std::string& path);
  StubPlan& SetMode(const std::string& path, mode_t mode);
  StubPlan& SetFileTime(const std::string& path, long long seconds);
  /// From now on every write to the memory volume at `path` fails with ENOSPC.
  StubPlan& FillVolume(const std::string& path);

  StubPlan& IgnoreSignal(int signal);
  StubPlan& SignalParent(int signal);  ///< to the process that started the stub
  StubPlan& DieBySignal(int signal);
  StubPlan& CloseOutput();  ///< standard output and standard error
  /// Runs a program with these arguments behind argument zero and waits for it.
  StubPlan& Run(const std::string& program, const std::vector<std::string>& arguments);
  /// Runs a program with the stub's own arguments: the stub records, the real tool works.
  StubPlan& PassThrough(const std::string& program);
  StubPlan& Exit(int status);

  const std::vector<StubStep>& Steps() const { return steps_; }

 private:
  StubPlan& Add(std::string word, std::vector<std::string> operands);
  std::vector<StubStep> steps_;
};

}  // namespace vela_test
