// velathumb-status [OPTION]... [DIR]...
//
// Tells people and scripts what is still to be done.

#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <iostream>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "html_page.h"
#include "json_report.h"
#include "options.h"
#include "progress_report.h"
#include "progress_watch.h"
#include "queue_report.h"
#include "status_scan.h"
#include "text_encoding.h"
#include "text_report.h"
#include "video_check_fault.h"

namespace vela {

namespace {

constexpr int kNothingToDo = 0;
constexpr int kWorkOutstanding = 1;
constexpr int kError = 2;

/// Hands everything to several others and remembers whether there is work.
class SinkList : public StatusSink {
 public:
  void Append(StatusSink* sink) { sinks_.push_back(sink); }
  bool HasWork() const { return hasWork_; }

  void BeginDirectory() override {
    for (StatusSink* sink : sinks_) sink->BeginDirectory();
  }
  void TakePhoto(const PhotoReport& photo) override {
    for (StatusSink* sink : sinks_) sink->TakePhoto(photo);
  }
  void EndDirectory(const DirectoryReport& directory) override {
    for (StatusSink* sink : sinks_) sink->EndDirectory(directory);
  }
  void TakeTotals(const StatusTotals& totals) override {
    hasWork_ = totals.all.HasWork();
    for (StatusSink* sink : sinks_) sink->TakeTotals(totals);
  }

 private:
  std::vector<StatusSink*> sinks_;
  bool hasWork_ = false;
};

/// One run over all questions of a command line.
class StatusRun {
 public:
  explicit StatusRun(Options options) : options_(std::move(options)), json_(std::cout) {}

  /// Answers and returns the exit status.
  int Run();

 private:
  void Watch();
  void Answer();
  bool CanCheckVideos();
  void AnswerDirectories();
  void AnswerQueues();
  void AnswerProgress();
  void AnswerResumeTime();
  void TakePageError(int error);
  void TakeError(const std::string& path, const std::string& message);
  void TakeWork(bool hasWork) { hasWork_ = hasWork_ || hasWork; }
  ScanErrorHandler ErrorHandler() {
    return
        [this](const std::string& path, const std::string& message) { TakeError(path, message); };
  }

  Options options_;
  JsonReport json_;
  Json::Value errors_{Json::arrayValue};
  bool hasWork_ = false;
};

void StatusRun::TakeError(const std::string& path, const std::string& message) {
  std::cerr << "velathumb-status: " << ToPlainLine(path) << ": " << message << '\n';
  Json::Value error;
  PutBytes(error, "path", path);
  error["message"] = message;
  errors_.append(error);
}

bool StatusRun::CanCheckVideos() {
  const std::string fault = FindVideoCheckFault();
  if (!fault.empty()) {
    TakeError("--check-videos", fault);
  }
  return fault.empty();
}

void StatusRun::AnswerDirectories() {
  std::unique_ptr<HtmlPage> page;
  if (!options_.htmlFile.empty()) {
    page = std::make_unique<HtmlPage>(options_.htmlFile);
    if (page->Error() != 0) {
      TakePageError(page->Error());
      return;
    }
  }
  SinkList sinks;
  std::unique_ptr<StatusSink> answer;
  if (options_.json) {
    answer = std::make_unique<JsonStatus>(json_, options_.photos);
  } else {
    answer = std::make_unique<TextReport>(std::cout, options_.photos);
  }
  sinks.Append(answer.get());
  if (page != nullptr) {
    sinks.Append(page.get());
  }
  ScanStatus(options_.directories, {options_.recursive, options_.checkVideos}, sinks,
             ErrorHandler());
  TakeWork(sinks.HasWork());
  if (page != nullptr && page->Finish() != 0) {
    TakePageError(page->Error());
  }
}

void StatusRun::TakePageError(int error) {
  // What stands there and is no file is never replaced.
  TakeError(options_.htmlFile, error == EEXIST ? "is no regular file" : std::strerror(error));
}

void StatusRun::AnswerQueues() {
  const QueueQuestion question = {options_.checkVideos};
  TakeWork(options_.json ? WriteQueueJson(json_, question, ErrorHandler())
                         : WriteQueueText(std::cout, question, ErrorHandler()));
}

void StatusRun::AnswerProgress() {
  const ProgressState state = ReadProgressState();
  TakeWork(state.HasWork());
  if (options_.json) {
    json_.Member("progress", DescribeProgress(state));
  } else {
    WriteProgressText(std::cout, state);
  }
}

void StatusRun::AnswerResumeTime() {
  const ResumeState state = ReadResumeState();
  if (options_.json) {
    json_.Member("resume", DescribeResume(state));
  } else {
    WriteResumeText(std::cout, state);
  }
}

void StatusRun::Watch() {
  const bool isTerminal = isatty(STDOUT_FILENO) == 1;
  TakeWork(WatchProgress(std::cout, isTerminal, options_.json));
}

void StatusRun::Answer() {
  options_.checkVideos = options_.checkVideos && CanCheckVideos();
  if (!options_.directories.empty()) AnswerDirectories();
  if (options_.queue) AnswerQueues();
  if (options_.progress) AnswerProgress();
  if (options_.resumeTime) AnswerResumeTime();
  if (options_.json) {
    json_.Member("errors", errors_);
    json_.End();
  }
}

int StatusRun::Run() {
  if (options_.watch) {
    Watch();
  } else {
    Answer();
  }
  if (!std::cout.flush()) {
    TakeError("standard output", "cannot be written");
  }
  if (!errors_.empty()) {
    return kError;
  }
  return hasWork_ ? kWorkOutstanding : kNothingToDo;
}

int RunMain(int argc, char** argv) {
  Options options;
  switch (ParseOptions(argc, argv, options)) {
    case ParseOutcome::kDone:
      return kNothingToDo;
    case ParseOutcome::kWrong:
      return kError;
    case ParseOutcome::kRun:
      break;
  }
  try {
    std::ios::sync_with_stdio(false);
    return StatusRun(std::move(options)).Run();
  } catch (const std::exception& error) {
    std::cerr << "velathumb-status: " << error.what() << '\n';
    return kError;
  }
}

}  // namespace

}  // namespace vela

int main(int argc, char** argv) {
  return vela::RunMain(argc, argv);
}
