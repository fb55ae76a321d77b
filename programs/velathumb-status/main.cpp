// velathumb-status [OPTION]... [DIR]...
//
// Reports the outstanding work, for people and scripts.

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "cli/command_line.h"
#include "configuration_report.h"
#include "failure_list.h"
#include "failure_reason.h"
#include "html_page.h"
#include "json_report.h"
#include "options.h"
#include "posix/terminal.h"
#include "progress_report.h"
#include "progress_watch.h"
#include "queue_report.h"
#include "security_report.h"
#include "status_scan.h"
#include "text_encoding.h"
#include "text_report.h"
#include "video_check_fault.h"

namespace vela {

namespace {

constexpr int kNothingToDo = 0;
constexpr int kWorkOutstanding = 1;
constexpr int kError = 2;

/// Passes everything on to several sinks and remembers whether there is work.
class SinkList : public StatusSink {
 public:
  void Append(StatusSink* sink) { sinks_.push_back(sink); }
  bool HasWork() const { return hasWork_; }

  void BeginDirectory() override {
    for (StatusSink* sink : sinks_) {
      sink->BeginDirectory();
    }
  }
  void TakePhoto(const PhotoReport& photo) override {
    for (StatusSink* sink : sinks_) {
      sink->TakePhoto(photo);
    }
  }
  void EndDirectory(const DirectoryReport& directory) override {
    for (StatusSink* sink : sinks_) {
      sink->EndDirectory(directory);
    }
  }
  void TakeTotals(const StatusTotals& totals) override {
    hasWork_ = totals.all.HasWork();
    for (StatusSink* sink : sinks_) {
      sink->TakeTotals(totals);
    }
  }

 private:
  std::vector<StatusSink*> sinks_;
  bool hasWork_ = false;
};

/// Produces everything that the command line requests.
class StatusRun {
 public:
  explicit StatusRun(Options options) : options_(std::move(options)), json_(std::cout) {}

  /// Writes the reports and returns the exit status.
  int Run();

 private:
  void Watch();
  void Report();
  bool CanCheckVideos();
  void ReportDirectories();
  std::unique_ptr<StatusSink> MakeReport();
  void Scan(HtmlPage* page);
  void ReportQueues();
  void ReportProgress();
  void ReportResumeTime();
  void ReportSecurity();
  void ReportConfiguration();
  void AddPageError(int error);
  void AddError(const std::string& path, const std::string& message);
  void AddWork(bool hasWork) { hasWork_ = hasWork_ || hasWork; }
  ScanErrorHandler ErrorHandler() {
    return [this](const std::string& path, const std::string& message) { AddError(path, message); };
  }

  Options options_;
  JsonReport json_;
  Json::Value errors_{Json::arrayValue};
  bool hasWork_ = false;
};

void StatusRun::AddError(const std::string& path, const std::string& message) {
  std::cerr << "velathumb-status: " << ToPlainLine(path) << ": " << message << '\n';
  Json::Value error;
  PutBytes(error, "path", path);
  error["message"] = message;
  errors_.append(error);
}

bool StatusRun::CanCheckVideos() {
  const std::string fault = FindVideoCheckFault();
  if (!fault.empty()) {
    AddError("--check-videos", fault);
  }
  return fault.empty();
}

void StatusRun::ReportDirectories() {
  std::unique_ptr<HtmlPage> page;
  if (!options_.htmlFile.empty()) {
    page = std::make_unique<HtmlPage>(options_.htmlFile);
    if (page->Error() != 0) {
      AddPageError(page->Error());
      return;
    }
  }
  Scan(page.get());
  if (page != nullptr && page->Finish() != 0) {
    AddPageError(page->Error());
  }
}

std::unique_ptr<StatusSink> StatusRun::MakeReport() {
  if (options_.json) {
    return std::make_unique<JsonStatus>(json_, options_.photos);
  }
  if (options_.nulTerminated) {
    return std::make_unique<FailurePaths>(std::cout);
  }
  if (options_.failed) {
    return std::make_unique<FailureLines>(std::cout);
  }
  return std::make_unique<TextReport>(std::cout, options_.photos);
}

void StatusRun::Scan(HtmlPage* page) {
  const std::unique_ptr<StatusSink> report = MakeReport();
  FailureValues failures;
  SinkList sinks;
  sinks.Append(report.get());
  if (options_.failed && options_.json) {
    sinks.Append(&failures);
  }
  if (page != nullptr) {
    sinks.Append(page);
  }
  ReasonFinder finder(sinks, options_.failed ? kNoReasonLimits : kPageReasonLimits);
  const bool findsReasons = page != nullptr || (options_.failed && !options_.nulTerminated);
  ScanStatus(options_.directories, {options_.recursive, options_.checkVideos},
             findsReasons ? static_cast<StatusSink&>(finder) : sinks, ErrorHandler());
  if (options_.failed && options_.json) {
    json_.Member("failed", failures.List());
  }
  AddWork(sinks.HasWork());
}

void StatusRun::AddPageError(int error) {
  // Only a regular file is ever replaced.
  AddError(options_.htmlFile, error == EEXIST ? "is not a regular file" : std::strerror(error));
}

void StatusRun::ReportQueues() {
  AddWork(options_.json ? WriteQueueJson(json_, options_.checkVideos, ErrorHandler())
                        : WriteQueueText(std::cout, options_.checkVideos, ErrorHandler()));
}

void StatusRun::ReportProgress() {
  const ProgressState state = ReadProgressState();
  AddWork(state.HasWork());
  if (options_.json) {
    json_.Member("progress", DescribeProgress(state));
  } else {
    WriteProgressText(std::cout, state);
  }
}

void StatusRun::ReportResumeTime() {
  const ResumeState state = ReadResumeState();
  if (options_.json) {
    json_.Member("resume", DescribeResume(state));
  } else {
    std::cout << ResumeText(state) << '\n';
  }
}

void StatusRun::ReportSecurity() {
  const SecurityState state = ReadSecurityState();
  if (options_.json) {
    json_.Member("security", DescribeSecurity(state));
  } else {
    WriteSecurityText(std::cout, state);
  }
}

void StatusRun::ReportConfiguration() {
  const ConfigurationState state = CheckConfiguration(options_.profileFile);
  for (const UncheckedFile& unchecked : state.result.unchecked) {
    AddError(unchecked.file, std::strerror(unchecked.error));
  }
  AddWork(!state.result.findings.empty());
  if (options_.json) {
    json_.Member("configuration", DescribeConfiguration(state));
  } else {
    WriteConfigurationText(std::cout, state);
  }
}

void StatusRun::Watch() {
  AddWork(WatchProgress(std::cout, IsOutputTerminal(), options_.json));
}

void StatusRun::Report() {
  options_.checkVideos = options_.checkVideos && CanCheckVideos();
  if (options_.failed && options_.directories.empty()) {
    options_.directories = {"."};
  }
  if (!options_.directories.empty()) {
    ReportDirectories();
  }
  if (options_.queue) {
    ReportQueues();
  }
  if (options_.progress) {
    ReportProgress();
  }
  if (options_.resumeTime) {
    ReportResumeTime();
  }
  if (options_.security) {
    ReportSecurity();
  }
  if (options_.checkConfig) {
    ReportConfiguration();
  }
  if (options_.json) {
    json_.Member("errors", errors_);
    json_.End();
  }
}

int StatusRun::Run() {
  if (options_.watch) {
    Watch();
  } else {
    Report();
  }
  if (!std::cout.flush()) {
    AddError("standard output", "cannot be written");
  }
  if (!errors_.empty()) {
    return kError;
  }
  return hasWork_ ? kWorkOutstanding : kNothingToDo;
}

int Run(Options& options) {
  std::ios::sync_with_stdio(false);
  return StatusRun(std::move(options)).Run();
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunProgram(argc, argv, vela::ParseOptions, vela::Run, vela::kError);
}
