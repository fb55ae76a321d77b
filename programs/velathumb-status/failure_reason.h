// Why a photo cannot be converted.
#pragma once

#include <chrono>
#include <string>

#include "status_report.h"

namespace vela {

/// Tries to convert a photo, confined as in velathumb, and discards the result. Uses the photo's
/// largest thumbnail instead if there is one: the others are made from it. Nothing is changed; what
/// a raw or a large photo needs files for is in a private directory in /tmp for the time. Returns
/// the reason of the failure in one line of unchecked text, or a line that says that there is none.
std::string FindFailureReason(const PhotoReport& photo);

/// Adds the reasons to failed photos on their way to another sink.
class ReasonFinder : public StatusSink {
 public:
  /// No photo is examined after so many, or after so long.
  static constexpr int kMostPhotos = 100;
  static constexpr std::chrono::seconds kLongest{60};

  explicit ReasonFinder(StatusSink& next, std::chrono::seconds longest = kLongest)
      : next_(next), longest_(longest) {}

  void BeginDirectory() override { next_.BeginDirectory(); }
  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override { next_.EndDirectory(directory); }
  void TakeTotals(const StatusTotals& totals) override { next_.TakeTotals(totals); }

 private:
  std::string Find(const PhotoReport& photo);

  StatusSink& next_;
  const std::chrono::seconds longest_;
  int photos_ = 0;
  std::chrono::steady_clock::duration time_{};
};

}  // namespace vela
