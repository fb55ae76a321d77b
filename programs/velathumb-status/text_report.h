// The status of directories as lines of text.
#pragma once

#include <iosfwd>
#include <string>

#include "status_report.h"

namespace vela {

/// Writes a line for each directory, with `listPhotos` followed by lines for its incomplete photos,
/// and the totals.
class TextReport : public StatusSink {
 public:
  TextReport(std::ostream& out, bool listPhotos) : out_(out), listPhotos_(listPhotos) {}

  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override;
  void TakeTotals(const StatusTotals& totals) override;

 private:
  void WriteHeading();

  std::ostream& out_;
  const bool listPhotos_;
  bool hasHeading_ = false;
  std::string photoLines_;
};

}  // namespace vela
