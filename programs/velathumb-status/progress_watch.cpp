#include "progress_watch.h"

#include <json/writer.h>

#include <chrono>
#include <ostream>
#include <string>
#include <thread>

#include "index/strict_json.h"
#include "json_report.h"
#include "posix/terminal.h"
#include "progress_bar.h"
#include "progress_rate.h"
#include "progress_report.h"

namespace vela {

namespace {

constexpr std::chrono::milliseconds kInterval(500);
constexpr int kLineWidth = 80;  // elsewhere than on a terminal

/// Draws the line over the previous one, which works only while neither wraps.
void DrawBar(std::ostream& out, const std::string& line, int width) {
  out << '\r' << line.substr(0, static_cast<size_t>(width - 1)) << "\033[K" << std::flush;
}

Json::Value DescribeState(const ProgressState& state, const FollowedCount& followed,
                          const ProgressRate& rate) {
  Json::Value object = DescribeProgress(state);
  const auto perSecond = rate.PerSecond();
  const auto left = rate.TimeLeft(followed.count.total);
  object["unit"] = followed.unit;
  object["rate"] = perSecond ? Json::Value(*perSecond) : Json::Value();
  object["seconds_left"] = left ? Json::Value(Json::Int64{left->count()}) : Json::Value();
  return object;
}

/// Shows one state after the other.
class ProgressView {
 public:
  ProgressView(std::ostream& out, bool isTerminal, bool asJson)
      : out_(out), isTerminal_(isTerminal), asJson_(asJson) {}

  void Show(const ProgressState& state) {
    const FollowedCount followed = ChooseCount(state.summary);
    if (followed.unit != unit_) {
      // The rate of one counter says nothing about the other.
      rate_ = ProgressRate();
      unit_ = followed.unit;
    }
    rate_.Note(ProgressRate::Clock::now(), followed.count.completed);
    if (!asJson_ && isTerminal_) {
      const int width = TerminalWidth();
      DrawBar(out_, FormatProgressBar(followed, rate_, width), width);
      return;
    }
    std::string counts = ToJsonText(DescribeProgress(state));
    if (counts == lastCounts_) {
      return;
    }
    lastCounts_ = std::move(counts);
    out_ << (asJson_ ? ToJsonText(DescribeState(state, followed, rate_))
                     : FormatProgressBar(followed, rate_, kLineWidth))
         << std::endl;
  }

  void End(const ProgressState& state) {
    if (asJson_) {
      return;
    }
    if (isTerminal_) {
      out_ << '\n';
    }
    WriteProgressText(out_, state);
  }

 private:
  std::ostream& out_;
  const bool isTerminal_;
  const bool asJson_;
  ProgressRate rate_;
  std::string unit_;
  std::string lastCounts_;
};

}  // namespace

bool WatchProgress(std::ostream& out, bool isTerminal, bool asJson) {
  ProgressView view(out, isTerminal, asJson);
  ProgressState state = ReadProgressState();
  view.Show(state);
  while (!state.instances.empty() && out.good()) {
    std::this_thread::sleep_for(kInterval);
    state = ReadProgressState();
    view.Show(state);
  }
  view.End(state);
  return state.HasWork();
}

}  // namespace vela
