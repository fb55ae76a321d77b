// Why a photo cannot be converted.
#pragma once

#include <chrono>
#include <limits>
#include <string>

#include "status_report.h"

namespace vela {

/// Tries to convert a photo, confined as in velathumb, and discards the result. Uses the photo's
/// largest thumbnail instead if it is larger than those that have failed: they are made from it.
/// Nothing is changed; what a raw or a large photo needs files for is in a private directory in
/// /tmp for the time. Returns the reason of the failure in one line of unchecked text, or a line
/// that says that there is none.
std::string FindFailureReason(const PhotoReport& photo);

/// When ReasonFinder stops examining photos.
struct ReasonLimits {
  int photos;                                ///< after so many
  std::chrono::steady_clock::duration time;  ///< after so long
};

constexpr ReasonLimits kNoReasonLimits{std::numeric_limits<int>::max(),
                                       std::chrono::steady_clock::duration::max()};
/// For a page that is about all photos and may be made often.
constexpr ReasonLimits kPageReasonLimits{100, std::chrono::seconds(60)};

/// Adds the reasons to failed photos on their way to another sink.
class ReasonFinder : public StatusSink {
 public:
  ReasonFinder(StatusSink& next, const ReasonLimits& limits) : next_(next), limits_(limits) {}

  void BeginDirectory() override { next_.BeginDirectory(); }
  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override { next_.EndDirectory(directory); }
  void TakeTotals(const StatusTotals& totals) override { next_.TakeTotals(totals); }

 private:
  std::string Find(const PhotoReport& photo);

  StatusSink& next_;
  const ReasonLimits limits_;
  int photos_ = 0;
  std::chrono::steady_clock::duration time_{};
};

}  // namespace vela
