// The status of directories as one self-contained page.
#pragma once

#include <cstdint>
#include <string>

#include "html_counts.h"
#include "posix/new_file.h"
#include "status_report.h"

namespace vela {

/// Writes the page during the scan; the file appears only when the page is complete. Holds no more
/// than one thumbnail in memory.
class HtmlPage : public StatusSink {
 public:
  /// `path` is a new file, a file to replace, or a symbolic link to one, see FilePlace. Anything
  /// else there (a directory, a device) is kept and makes Finish fail.
  explicit HtmlPage(const std::string& path);
  /// Removes what was written of an unfinished page.
  ~HtmlPage() override;

  void BeginDirectory() override;
  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override;
  void TakeTotals(const StatusTotals& totals) override;

  /// Returns the first error so far, an errno value, 0 when there was none.
  int Error() const;

  /// Replaces the file with the finished page. Returns 0, or an errno value when something could
  /// not be written; the old file is then kept.
  int Finish();

 private:
  template <typename Step>
  void Do(const Step& step);

  const FilePlace place_;
  int error_ = 0;  // apart from the errors of its place and files
  NewFile body_;
  NewFile photos_;  // of the current directory, until its counts are known
  ThumbShares directoryShares_;
  ThumbShares shares_;
  StatusTotals totals_;
  int64_t sections_ = 0;
};

}  // namespace vela
