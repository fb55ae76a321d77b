#include "progress_watch.h"

#include <json/writer.h>

#include <algorithm>
#include <chrono>
#include <ostream>
#include <string>
#include <thread>
#include <utility>

#include "conversion_state.h"
#include "index/strict_json.h"
#include "json_report.h"
#include "posix/terminal.h"
#include "progress_bar.h"
#include "progress_rate.h"
#include "progress_report.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

constexpr std::chrono::milliseconds kInterval(500);
constexpr int kLineWidth = 80;  // elsewhere than on a terminal

/// Draws the line over the previous one, which works only while neither wraps.
void DrawBar(std::ostream& out, const std::string& line, int width) {
  out << '\r' << line.substr(0, static_cast<size_t>(width - 1)) << "\033[K" << std::flush;
}

const char* ActivityName(Activity activity) {
  switch (activity) {
    case Activity::kRunning:
      return "running";
    case Activity::kIdle:
      return "idle";
    case Activity::kPaused:
      return "paused";
    case Activity::kWaiting:
      return "waiting";
    case Activity::kEnded:
      break;
  }
  return "ended";
}

Json::Value PauseName(Pause pause) {
  switch (pause) {
    case Pause::kNone:
      break;
    case Pause::kResumeTime:
      return "resume_time";
    case Pause::kIndexService:
      return "index_service";
  }
  return {};
}

/// Returns what has to change for a new line.
Json::Value DescribeState(const ConversionState& state) {
  Json::Value object = DescribeProgress(state.progress);
  object["activity"] = ActivityName(state.activity);
  object["paused_by"] = PauseName(state.pause);
  object["deferred_entries"] = Json::Int64{state.deferred};
  object["resume_time"] = state.pause == Pause::kResumeTime
                              ? Json::Value(Json::Int64{state.resume.resumeTime})
                              : Json::Value();
  return object;
}

Json::Value DescribeMoment(const ConversionState& state, const FollowedCount& followed,
                           const ProgressRate& rate) {
  Json::Value object = DescribeState(state);
  const auto perSecond = rate.PerSecond();
  const auto left = rate.TimeLeft(followed.count.total);
  object["unit"] = followed.unit;
  object["rate"] = perSecond ? Json::Value(*perSecond) : Json::Value();
  object["seconds_left"] = left ? Json::Value(Json::Int64{left->count()}) : Json::Value();
  object["seconds_until_resume"] = state.pause == Pause::kResumeTime && state.resume.resumeTime > 0
                                       ? Json::Value(Json::Int64{state.resume.waitSeconds})
                                       : Json::Value();
  return object;
}

/// Returns the line for a terminal of `width` columns. While no velathumb is running the counters
/// may be those of an earlier run, and a bar would show it as finished.
std::string FormatLine(const ConversionState& state, const FollowedCount& followed,
                       const ProgressRate& rate, int width) {
  switch (state.activity) {
    case Activity::kPaused:
      return PauseText(state);
    case Activity::kIdle:
      return HasPhotosToProcess() ? "velathumb-queue is running, but no velathumb: it counts "
                                    "photos, or directories are locked"
                                  : "velathumb-queue is waiting for entries";
    case Activity::kWaiting:
      return "the queue has entries, waiting for velathumb-queue";
    case Activity::kRunning:
    case Activity::kEnded:
      break;
  }
  return FormatProgressBar(followed, rate, width);
}

/// Shows one state after the other.
class ProgressView {
 public:
  ProgressView(std::ostream& out, bool isTerminal, bool asJson)
      : out_(out), isTerminal_(isTerminal), asJson_(asJson) {}

  void Show(const ConversionState& state) {
    const FollowedCount followed = ChooseCount(state.progress.summary);
    if (followed.unit != unit_) {
      // The rate of one counter says nothing about the other.
      rate_ = ProgressRate();
      unit_ = followed.unit;
    }
    rate_.Note(ProgressRate::Clock::now(), followed.count.completed);
    if (!asJson_ && isTerminal_) {
      const int width = TerminalWidth();
      DrawBar(out_, FormatLine(state, followed, rate_, width), width);
      return;
    }
    std::string description = ToJsonText(DescribeState(state));
    if (description == lastState_) {
      return;
    }
    lastState_ = std::move(description);
    const std::string line = asJson_ ? ToJsonText(DescribeMoment(state, followed, rate_))
                                     : FormatLine(state, followed, rate_, kLineWidth);
    if (line != lastLine_) {
      out_ << line << std::endl;
      lastLine_ = line;
    }
  }

  void End(const ConversionState& state) {
    if (asJson_) {
      return;
    }
    if (isTerminal_) {
      out_ << '\n';
    }
    WriteProgressText(out_, state.progress);
    if (state.activity == Activity::kPaused) {
      out_ << PauseText(state) << '\n';
    } else if (state.activity == Activity::kWaiting) {
      out_ << "the queue has entries, but nothing processes them; velathumb-queue would\n";
    }
    if (state.deferred > 0) {
      out_ << state.deferred << (state.deferred == 1 ? " entry is" : " entries are")
           << " deferred to a later run; velathumb-status --queue lists them\n";
    }
  }

 private:
  std::ostream& out_;
  const bool isTerminal_;
  const bool asJson_;
  ProgressRate rate_;
  std::string unit_;
  std::string lastState_;
  std::string lastLine_;
};

/// Notices that nothing happens.
class Standstill {
 public:
  using Clock = std::chrono::steady_clock;

  /// Takes one state after the other. Returns for how long it has been the same.
  Clock::duration Note(const ConversionState& state) {
    const auto now = Clock::now();
    std::string description = ToJsonText(DescribeState(state));
    if (description != last_) {
      last_ = std::move(description);
      since_ = now;
    }
    return now - since_;
  }

 private:
  std::string last_;
  Clock::time_point since_;
};

/// Reads and shows one state after the other.
class Watch {
 public:
  Watch(ProgressView& view, const WatchLimits& limits) : view_(view), limits_(limits) {}

  /// Returns whether there is more to follow.
  bool Step() {
    state_ = observer_.Read();
    const auto standstill = standstill_.Note(state_);
    const bool hasVelathumb = !state_.progress.instances.empty();
    if (state_.activity == Activity::kRunning && !hasVelathumb && standstill >= limits_.idle) {
      state_.activity = Activity::kIdle;
    }
    view_.Show(state_);
    const bool isGivenUp =
        state_.activity == Activity::kWaiting && standstill >= limits_.unattended;
    return state_.mayContinue && !isGivenUp;
  }

  const ConversionState& State() const { return state_; }

 private:
  ProgressView& view_;
  const WatchLimits limits_;
  ConversionObserver observer_;
  ConversionState state_;
  Standstill standstill_;
};

}  // namespace

bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson, const WatchLimits& limits) {
  ProgressView view(out, isTerminal, asJson);
  Watch watch(view, limits);
  while (watch.Step() && out.good()) {
    std::this_thread::sleep_for(std::min({kInterval, limits.unattended, limits.idle}));
  }
  const ConversionState& state = watch.State();
  view.End(state);
  return state.progress.HasWork() || state.deferred > 0 || state.activity == Activity::kWaiting;
}

}  // namespace vela
