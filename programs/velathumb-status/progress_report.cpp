#include "progress_report.h"

#include <ctime>
#include <ostream>
#include <string>

#include "thumb/running_instances.h"

namespace vela {

namespace {

bool IsOutstanding(const ProgressCount& count) {
  return count.completed < count.total;
}

Json::Value DescribeCount(const ProgressCount& count) {
  Json::Value object;
  object["total"] = count.total;
  object["completed"] = count.completed;
  object["ratio"] = double{count.Ratio()};
  return object;
}

/// Returns the local time in the form 2026-01-31 12:00:00 +0100.
std::string FormatTime(time_t time) {
  struct tm parts = {};
  char text[64] = "";
  if (localtime_r(&time, &parts) == nullptr ||
      std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S %z", &parts) == 0) {
    return std::to_string(time);
  }
  return text;
}

}  // namespace

bool ProgressState::HasWork() const {
  return IsOutstanding(summary.photo) || IsOutstanding(summary.thumb) ||
         IsOutstanding(summary.video);
}

ProgressState ReadProgressState() {
  return {ReadProgressSummary(), RunningInstances()};
}

void WriteProgressText(std::ostream& out, const ProgressState& state) {
  for (const std::string& line : FormatProgressSummary(state.summary)) {
    out << line << '\n';
  }
  if (state.instances.empty()) {
    out << "no velathumb is running\n";
    return;
  }
  out << "velathumb is running, process";
  for (const pid_t pid : state.instances) {
    out << ' ' << pid;
  }
  out << '\n';
}

Json::Value DescribeProgress(const ProgressState& state) {
  Json::Value object;
  object["photo"] = DescribeCount(state.summary.photo);
  object["thumb"] = DescribeCount(state.summary.thumb);
  object["video"] = DescribeCount(state.summary.video);
  object["instances"] = Json::Value(Json::arrayValue);
  for (const pid_t pid : state.instances) {
    object["instances"].append(pid);
  }
  return object;
}

std::string ResumeText(const ResumeState& state) {
  if (state.isReached) {
    return "conversion is not paused";
  }
  if (state.resumeTime < 0) {
    return "conversion is paused indefinitely (resume time " + std::to_string(state.resumeTime) +
           ")";
  }
  return "conversion is paused until " + FormatTime(state.resumeTime) + ", for " +
         std::to_string(state.waitSeconds) + " s";
}

Json::Value DescribeResume(const ResumeState& state) {
  Json::Value object;
  object["resume_time"] = static_cast<Json::Int64>(state.resumeTime);
  object["reached"] = state.isReached;
  object["wait_seconds"] = static_cast<Json::Int64>(state.waitSeconds);
  return object;
}

}  // namespace vela
