// The plan of a stub tool's call: steps that the test defines beforehand.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

namespace vela_test {

/// One step: a word and its operands.
using StubStep = std::vector<std::string>;

/// The steps of one call, in order:
///   StubPlan().WriteOutputs(1).AppendToSource(100000).WriteOutputs().Exit(3)
/// A plan ends with exit status 0 (or that of its last Run or PassThrough) unless it says
/// otherwise; an empty plan does nothing at all. The outputs are those of the converter's command
/// line: the argument after each "-write", then the last argument. Where a step takes a path,
/// kSource is the photo (the input argument without "[0]") and kOutputDirectory the directory of
/// the first output.
class StubPlan {
 public:
  static constexpr const char* kSource = "{source}";
  static constexpr const char* kOutputDirectory = "{output directory}";
  static constexpr size_t kAll = static_cast<size_t>(-1);

  /// A converter that works: all outputs, status 0.
  static StubPlan Normal() { return StubPlan().WriteOutputs(); }

  /// Writes the next `count` outputs, each a small complete grey JPEG of its "-thumbnail" box.
  StubPlan& WriteOutputs(size_t count = kAll) { return Add("write-outputs", count); }
  /// Writes the next `count` outputs with exactly `bytes` bytes each (a JPEG's beginning).
  StubPlan& WriteOutputsOfSize(size_t count, size_t bytes) {
    return Add("write-outputs-of-size", count, bytes);
  }
  /// Writes the next output with this content.
  StubPlan& WriteOutput(const std::string& content) { return Add("write-output", content); }
  /// Leaves out the next `count` outputs.
  StubPlan& SkipOutputs(size_t count = 1) { return Add("skip-outputs", count); }

  /// Print on standard output or standard error, as often as `times` says.
  StubPlan& Print(const std::string& bytes) { return PrintRepeated(bytes, 1); }
  StubPlan& PrintError(const std::string& bytes) { return PrintErrorRepeated(bytes, 1); }
  StubPlan& PrintRepeated(const std::string& text, size_t times) {
    return Add("print", text, times);
  }
  StubPlan& PrintErrorRepeated(const std::string& text, size_t times) {
    return Add("print-error", text, times);
  }

  StubPlan& Sleep(int milliseconds) { return Add("sleep", milliseconds); }
  /// Makes an empty file, from which the test knows that this step has been reached.
  StubPlan& CreateFile(const std::string& path) { return WriteFile(path, ""); }
  /// Waits until the test makes the file; gives up after 60 s with status 125.
  StubPlan& WaitForFile(const std::string& path) { return Add("wait-for-file", path); }
  StubPlan& WriteFile(const std::string& path, const std::string& content) {
    return Add("write-file", path, content);
  }

  /// Grow a file: in size and blocks, by a hole that takes no blocks, or by blocks beyond its end.
  StubPlan& AppendToFile(const std::string& path, size_t bytes) {
    return Add("append", path, bytes);
  }
  StubPlan& GrowSizeOnly(const std::string& path, size_t bytes) {
    return Add("grow-size", path, bytes);
  }
  StubPlan& GrowBlocksOnly(const std::string& path, size_t bytes) {
    return Add("grow-blocks", path, bytes);
  }
  StubPlan& AppendToSource(size_t bytes) { return AppendToFile(kSource, bytes); }
  /// Removes a file or a whole tree.
  StubPlan& Remove(const std::string& path) { return Add("remove", path); }
  StubPlan& ReplaceByDirectory(const std::string& path) {
    return Add("replace-by-directory", path);
  }
  StubPlan& SetMode(const std::string& path, mode_t mode) { return Add("set-mode", path, mode); }
  StubPlan& SetFileTime(const std::string& path, long long seconds) {
    return Add("set-file-time", path, seconds);
  }
  /// From now on every write to the memory volume at `path` fails with ENOSPC.
  StubPlan& FillVolume(const std::string& path) { return Add("fill-volume", path); }

  StubPlan& IgnoreSignal(int signal) { return Add("ignore-signal", signal); }
  /// Sends the signal to the process that has started the stub.
  StubPlan& SignalParent(int signal) { return Add("signal-parent", signal); }
  StubPlan& DieBySignal(int signal) { return Add("die-by-signal", signal); }
  /// Closes standard output and standard error.
  StubPlan& CloseOutput() { return Add("close-output"); }
  /// Runs a program with these arguments after argument zero and waits for it.
  StubPlan& Run(const std::string& program, const std::vector<std::string>& arguments) {
    Add("run", program);
    steps_.back().insert(steps_.back().end(), arguments.begin(), arguments.end());
    return *this;
  }
  /// Runs a program with the stub's own arguments: the stub records, the real tool does the work.
  StubPlan& PassThrough(const std::string& program) { return Add("pass-through", program); }
  StubPlan& Exit(int status) { return Add("exit", status); }

  const std::vector<StubStep>& Steps() const { return steps_; }

 private:
  static std::string Text(const std::string& text) { return text; }
  template <typename Number>
  static std::string Text(Number number) {
    return std::to_string(number);
  }
  template <typename... Operands>
  StubPlan& Add(const char* word, const Operands&... operands) {
    steps_.push_back({word, Text(operands)...});
    return *this;
  }

  std::vector<StubStep> steps_;
};

}  // namespace vela_test
