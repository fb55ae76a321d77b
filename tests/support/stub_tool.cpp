#include "support/stub_tool.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <sstream>

#include "support/build_paths.h"
#include "support/environment_failure.h"
#include "support/field_codec.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/stub_files.h"

namespace vela_test {

namespace {

using Record = std::map<std::string, std::string>;

std::string BaseName(const std::string& path) {
  return path.substr(path.rfind('/') + 1);
}

std::string EncodePlan(const StubPlan& plan) {
  std::vector<std::string> steps;
  for (const StubStep& step : plan.Steps()) {
    steps.push_back(EncodeFields(step));
  }
  return EncodeFields(steps);
}

void InstallLink(const std::string& target, const std::string& path) {
  if (access(target.c_str(), X_OK) != 0) {
    EnvironmentFailureWithErrno("cannot use " + target);
  }
  unlink(path.c_str());
  if (symlink(target.c_str(), path.c_str()) != 0) {
    EnvironmentFailureWithErrno("cannot make " + path);
  }
}

constexpr const char* kUnconfinedTools = "/usr/vela/etc/unconfined-tools";

/// Adds or removes the tool's line in the list of those that run unconfined: a stub writes its
/// record and whatever its plan says.
void SetUnconfined(const std::string& path, bool isUnconfined) {
  std::istringstream old(Exists(kUnconfinedTools) ? ReadFile(kUnconfinedTools) : "");
  std::string list;
  for (std::string line; std::getline(old, line);) {
    list += line == path ? "" : line + "\n";
  }
  MakeDirectories("/usr/vela/etc");
  WriteFile(kUnconfinedTools, isUnconfined ? list + path + "\n" : list);
  chmod(kUnconfinedTools, 0644);
}

Record ParseRecord(const std::string& text) {
  const std::vector<std::string> fields = DecodeFields(text);
  Record record;
  for (size_t i = 0; i + 1 < fields.size(); i += 2) {
    record[fields[i]] = fields[i + 1];
  }
  return record;
}

std::vector<Record> AllRecords() {
  std::vector<Record> records;
  for (const std::string& text : DecodeFields(ReadFile(kStubRecordFile))) {
    records.push_back(ParseRecord(text));
  }
  return records;
}

long long Number(const std::string& text) {
  return std::strtoll(text.c_str(), nullptr, 10);
}

uint64_t Unsigned(const std::string& text) {
  return std::strtoull(text.c_str(), nullptr, 10);
}

std::vector<int> Numbers(const std::string& encoded) {
  std::vector<int> numbers;
  for (const std::string& text : DecodeFields(encoded)) {
    numbers.push_back(static_cast<int>(Number(text)));
  }
  return numbers;
}

std::vector<OpenDescriptor> Descriptors(const std::string& encoded) {
  const std::vector<std::string> fields = DecodeFields(encoded);
  std::vector<OpenDescriptor> descriptors;
  for (size_t i = 0; i + 1 < fields.size(); i += 2) {
    descriptors.push_back({static_cast<int>(Number(fields[i])), fields[i + 1]});
  }
  return descriptors;
}

StubCall CallFrom(Record record) {
  StubCall call;
  call.tool = record["tool"];
  call.path = record["path"];
  call.number = static_cast<int>(Number(record["number"]));
  call.arguments = DecodeFields(record["arguments"]);
  call.descriptors = Descriptors(record["descriptors"]);
  call.workingDirectory = record["directory"];
  call.blockedSignals = Numbers(record["blocked"]);
  call.ignoredSignals = Numbers(record["ignored"]);
  call.umask = static_cast<mode_t>(Number(record["umask"]));
  call.user = static_cast<uid_t>(Number(record["user"]));
  call.group = static_cast<gid_t>(Number(record["group"]));
  call.pid = static_cast<pid_t>(Number(record["pid"]));
  call.parentPid = static_cast<pid_t>(Number(record["parent"]));
  call.startSequence = Unsigned(record["sequence"]);
  call.startNanoseconds = Number(record["time"]);
  return call;
}

/// Adds an end to the call that it belongs to.
void AddEnd(Record* end, std::vector<StubCall>* calls) {
  const uint64_t started = Unsigned((*end)["start"]);
  for (StubCall& call : *calls) {
    if (call.startSequence == started) {
      call.endSequence = Unsigned((*end)["sequence"]);
      call.endNanoseconds = Number((*end)["time"]);
    }
  }
}

}  // namespace

std::vector<std::string> StubCall::Parameters() const {
  return arguments.empty() ? arguments
                           : std::vector<std::string>(arguments.begin() + 1, arguments.end());
}

StubTool::StubTool(const std::string& path) : tool_(BaseName(path)) {
  const std::string directory = StubToolDirectory(tool_);
  RemoveTree(directory);
  MakeDirectories(directory);
  WriteFile(directory + "/calls", "");
  chmod((directory + "/calls").c_str(), 0666);  // the stub may run as another user
  Plan(StubPlan::Normal());
  InstallLink(StubToolPath(), path);
  SetUnconfined(path, true);
}

void StubTool::Plan(const StubPlan& plan) const {
  WriteFile(StubToolDirectory(tool_) + "/plan.default", EncodePlan(plan));
}

void StubTool::PlanCall(int number, const StubPlan& plan) const {
  WriteFile(StubToolDirectory(tool_) + "/plan." + std::to_string(number), EncodePlan(plan));
}

void StubTool::PlanWhen(const std::string& argument, const StubPlan& plan) {
  // Numbered from the latest: the stub uses the highest that matches.
  WriteFile(StubToolDirectory(tool_) + "/condition." + std::to_string(++conditions_),
            EncodeFields({argument, EncodePlan(plan)}));
}

std::vector<StubCall> StubTool::Calls() const {
  std::vector<StubCall> calls;
  for (const StubCall& call : AllStubCalls()) {
    if (call.tool == tool_) {
      calls.push_back(call);
    }
  }
  return calls;
}

std::vector<StubCall> AllStubCalls() {
  std::vector<StubCall> calls;
  for (Record& record : AllRecords()) {
    if (record["event"] == "start") {
      calls.push_back(CallFrom(record));
    } else if (record["event"] == "end") {
      AddEnd(&record, &calls);
    } else {
      ADD_FAILURE() << "stub " << record["tool"] << ": " << record["problem"];
    }
  }
  std::sort(calls.begin(), calls.end(),
            [](const StubCall& a, const StubCall& b) { return a.startSequence < b.startSequence; });
  return calls;
}

uint64_t NextSequence() {
  return IncrementCounter(kStubSequenceFile);
}

bool IsOwnConverterReal() {
  const char* const choice = getenv("VELA_TEST_CONVERTER");
  return choice == nullptr || std::string(choice) != "imagemagick";
}

std::string RealConverterPath() {
  return IsOwnConverterReal() ? OwnConverterPath() : kImageMagickPath;
}

void InstallRealConverter() {
  MakeDirectories("/usr/vela/lib");
  InstallLink(kImageMagickPath, "/usr/vela/lib/convert-thumb");
  InstallLink(IsOwnConverterReal() ? OwnConverterPath()
                                   : SourceDirectory() + "/programs/convert-thumb/convert-thumb.sh",
              kConverterPath);
  SetUnconfined(kConverterPath, false);
}

void InstallRealExiftool() {
  InstallLink("/usr/bin/exiftool", kExiftoolPath);
  SetUnconfined(kExiftoolPath, false);
}

void InstallRealTools() {
  InstallRealConverter();
  InstallRealExiftool();
}

void RemoveTool(const std::string& path) {
  RemoveTree(path);
}

}  // namespace vela_test
