#include "support/stub_plan.h"

#include <utility>

namespace vela_test {

namespace {

std::string Text(size_t number) {
  return std::to_string(number);
}
std::string Text(int number) {
  return std::to_string(number);
}

}  // namespace

StubPlan& StubPlan::Add(std::string word, std::vector<std::string> operands) {
  steps_.push_back({std::move(word), std::move(operands)});
  return *this;
}

StubPlan& StubPlan::WriteOutputs(size_t count) {
  return Add("write-outputs", {Text(count)});
}

StubPlan& StubPlan::WriteOutputsOfSize(size_t count, size_t bytes) {
  return Add("write-outputs-of-size", {Text(count), Text(bytes)});
}

StubPlan& StubPlan::WriteOutput(const std::string& content) {
  return Add("write-output", {content});
}

StubPlan& StubPlan::SkipOutputs(size_t count) {
  return Add("skip-outputs", {Text(count)});
}

StubPlan& StubPlan::Print(const std::string& bytes) {
  return PrintRepeated(bytes, 1);
}

StubPlan& StubPlan::PrintError(const std::string& bytes) {
  return PrintErrorRepeated(bytes, 1);
}

StubPlan& StubPlan::PrintRepeated(const std::string& text, size_t times) {
  return Add("print", {text, Text(times)});
}

StubPlan& StubPlan::PrintErrorRepeated(const std::string& text, size_t times) {
  return Add("print-error", {text, Text(times)});
}

StubPlan& StubPlan::Sleep(int milliseconds) {
  return Add("sleep", {Text(milliseconds)});
}

StubPlan& StubPlan::CreateFile(const std::string& path) {
  return WriteFile(path, "");
}

StubPlan& StubPlan::WaitForFile(const std::string& path) {
  return Add("wait-for-file", {path});
}

StubPlan& StubPlan::WriteFile(const std::string& path, const std::string& content) {
  return Add("write-file", {path, content});
}

StubPlan& StubPlan::AppendToFile(const std::string& path, size_t bytes) {
  return Add("append", {path, Text(bytes)});
}

StubPlan& StubPlan::GrowSizeOnly(const std::string& path, size_t bytes) {
  return Add("grow-size", {path, Text(bytes)});
}

StubPlan& StubPlan::GrowBlocksOnly(const std::string& path, size_t bytes) {
  return Add("grow-blocks", {path, Text(bytes)});
}

StubPlan& StubPlan::Remove(const std::string& path) {
  return Add("remove", {path});
}

StubPlan& StubPlan::ReplaceByDirectory(const std::string& path) {
  return Add("replace-by-directory", {path});
}

StubPlan& StubPlan::SetMode(const std::string& path, mode_t mode) {
  return Add("set-mode", {path, std::to_string(mode)});
}

StubPlan& StubPlan::SetFileTime(const std::string& path, long long seconds) {
  return Add("set-file-time", {path, std::to_string(seconds)});
}

StubPlan& StubPlan::FillVolume(const std::string& path) {
  return Add("fill-volume", {path});
}

StubPlan& StubPlan::IgnoreSignal(int signal) {
  return Add("ignore-signal", {Text(signal)});
}

StubPlan& StubPlan::SignalParent(int signal) {
  return Add("signal-parent", {Text(signal)});
}

StubPlan& StubPlan::DieBySignal(int signal) {
  return Add("die-by-signal", {Text(signal)});
}

StubPlan& StubPlan::CloseOutput() {
  return Add("close-output", {});
}

StubPlan& StubPlan::Run(const std::string& program, const std::vector<std::string>& arguments) {
  std::vector<std::string> operands = {program};
  operands.insert(operands.end(), arguments.begin(), arguments.end());
  return Add("run", operands);
}

StubPlan& StubPlan::PassThrough(const std::string& program) {
  return Add("pass-through", {program});
}

StubPlan& StubPlan::Exit(int status) {
  return Add("exit", {Text(status)});
}

}  // namespace vela_test
