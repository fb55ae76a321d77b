#include "support/stub/performance.h"

#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "support/stub/call_record.h"
#include "support/stub/grey_jpeg.h"
#include "support/stub/steps.h"
#include "support/stub_plan.h"

namespace vela_test {

namespace {

constexpr int kBrokenPlan = 125;

size_t Size(const std::string& text) {
  return std::strtoull(text.c_str(), nullptr, 10);
}
int Number(const std::string& text) {
  return std::atoi(text.c_str());
}

std::string SmallJpeg(const StubOutput& output) {
  return GreyJpeg(output.width, output.height);
}

/// The JPEG truncated or padded to this number of bytes.
std::string JpegOfSize(const StubOutput& output, size_t bytes) {
  std::string content = SmallJpeg(output);
  content.resize(bytes);
  return content;
}

}  // namespace

Performance::Performance(const StubCommandLine& line, std::function<void()> beforeEnd)
    : line_(line), beforeEnd_(std::move(beforeEnd)) {}

int Performance::Perform(const std::vector<PlannedStep>& steps) {
  for (const PlannedStep& step : steps) {
    if (step.empty() || PerformStep(step) == Progress::kEnd) {
      break;
    }
  }
  return status_;
}

Performance::Progress Performance::PerformStep(const PlannedStep& step) {
  if (step[0] == "exit") {
    status_ = Number(step[1]);
    return Progress::kEnd;
  }
  if (!PerformOutputStep(step) && !PerformFileStep(step) && !PerformProcessStep(step)) {
    Fault("no such step: " + step[0]);
  }
  return Progress::kGoOn;
}

bool Performance::PerformOutputStep(const PlannedStep& step) {
  const std::string& word = step[0];
  if (word == "write-outputs") {
    WriteNextOutputs(Size(step[1]), SmallJpeg);
  } else if (word == "write-outputs-of-size") {
    WriteNextOutputs(Size(step[1]), [&step](const StubOutput& output) {
      return JpegOfSize(output, Size(step[2]));
    });
  } else if (word == "write-output") {
    WriteNextOutputs(1, [&step](const StubOutput&) { return step[1]; });
  } else if (word == "skip-outputs") {
    nextOutput_ += Size(step[1]);
  } else if (word == "print") {
    Print(STDOUT_FILENO, step[1], Size(step[2]));
  } else if (word == "print-error") {
    Print(STDERR_FILENO, step[1], Size(step[2]));
  } else if (word == "close-output") {
    close(STDOUT_FILENO);
    close(STDERR_FILENO);
  } else {
    return false;
  }
  return true;
}

bool Performance::PerformFileStep(const PlannedStep& step) {
  const std::string& word = step[0];
  const std::string path = step.size() > 1 ? Resolved(step[1]) : std::string();
  if (word == "write-file") {
    Must(WriteContent(path, step[2]), step);
  } else if (word == "append") {
    Must(AppendBytes(path, Size(step[2])), step);
  } else if (word == "grow-size") {
    Must(GrowSize(path, Size(step[2])), step);
  } else if (word == "grow-blocks") {
    Must(GrowBlocks(path, Size(step[2])), step);
  } else if (word == "remove") {
    Must(RemoveWhole(path), step);
  } else if (word == "replace-by-directory") {
    Must(ReplaceWithDirectory(path), step);
  } else if (word == "set-mode") {
    Must(chmod(path.c_str(), static_cast<mode_t>(Size(step[2]))) == 0 ? 0 : errno, step);
  } else if (word == "set-file-time") {
    Must(SetBothTimes(path, std::atoll(step[2].c_str())), step);
  } else if (word == "fill-volume") {
    Must(FillUp(path), step);
  } else {
    return false;
  }
  return true;
}

bool Performance::PerformProcessStep(const PlannedStep& step) {
  const std::string& word = step[0];
  if (word == "sleep") {
    SleepFor(Number(step[1]));
  } else if (word == "wait-for-file") {
    Must(AwaitFile(step[1]) ? 0 : ETIMEDOUT, step);
  } else if (word == "ignore-signal") {
    signal(Number(step[1]), SIG_IGN);
  } else if (word == "signal-parent") {
    Must(kill(getppid(), Number(step[1])) == 0 ? 0 : errno, step);
  } else if (word == "die-by-signal") {
    beforeEnd_();
    Die(Number(step[1]));
  } else if (word == "run") {
    status_ = RunAndWait(step[1], {step.begin() + 2, step.end()});
  } else if (word == "pass-through") {
    status_ = RunAndWait(step[1], {line_.arguments.begin() + 1, line_.arguments.end()});
  } else {
    return false;
  }
  return true;
}

void Performance::WriteNextOutputs(size_t count,
                                   const std::function<std::string(const StubOutput&)>& content) {
  for (; count > 0 && nextOutput_ < line_.outputs.size(); --count, ++nextOutput_) {
    const StubOutput& output = line_.outputs[nextOutput_];
    const int error = WriteContent(output.path, content(output));
    if (error != 0) {
      // Report it and continue, as the real converter does.
      std::fprintf(stderr, "unable to open image `%s': %s\n", output.path.c_str(),
                   std::strerror(error));
      status_ = 1;
    }
  }
}

void Performance::Print(int descriptor, const std::string& text, size_t times) {
  for (size_t i = 0; i < times; ++i) {
    if (WriteWhole(descriptor, text) != 0) {
      // The reader has closed its end. A write that had to wait fails without SIGPIPE, which only
      // the next one raises.
      status_ = 1;
      WriteWhole(descriptor, text);
      return;
    }
  }
}

std::string Performance::Resolved(const std::string& path) const {
  if (path == StubPlan::kSource) {
    return line_.source;
  }
  if (path == StubPlan::kOutputDirectory) {
    const std::string first = line_.outputs.empty() ? "" : line_.outputs[0].path;
    return first.substr(0, first.rfind('/'));
  }
  return path;
}

void Performance::Must(int error, const PlannedStep& step) {
  if (error != 0) {
    Fault(step[0] + " " + (step.size() > 1 ? Resolved(step[1]) : "") + ": " + std::strerror(error));
  }
}

void Performance::Fault(const std::string& problem) {
  std::fprintf(stderr, "stub: %s\n", problem.c_str());
  RecordProblem(line_.tool, problem);
  _exit(kBrokenPlan);
}

}  // namespace vela_test
