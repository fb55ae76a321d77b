// The state of directories as one self-contained page.
#pragma once

#include <cstdint>
#include <string>

#include "html_counts.h"
#include "page_file.h"
#include "status_report.h"

namespace vela {

/// Writes the page while the scan goes on; the file appears, whole, when the page is finished. It
/// holds no more than one thumbnail in memory.
class HtmlPage : public StatusSink {
 public:
  /// The page is to stand at `path`: a new file, or in place of a file or of a symbolic link to
  /// one. Anything else there (a directory, a device) stays and makes Finish fail.
  explicit HtmlPage(const std::string& path);
  /// Leaves nothing behind of a page that was not finished.
  ~HtmlPage() override;

  void BeginDirectory() override;
  void TakePhoto(const PhotoReport& photo) override;
  void EndDirectory(const DirectoryReport& directory) override;
  void TakeTotals(const StatusTotals& totals) override;

  /// Returns the first error so far, an errno value, 0 when there was none.
  int Error() const;

  /// Puts the finished page in place of what stands there. Returns 0, or an errno value when
  /// something could not be written; the old file then stays.
  int Finish();

 private:
  template <typename Step>
  void Do(const Step& step);

  const std::string path_;
  int error_;  // of the page itself; those of its files are theirs
  PageFile body_;
  PageFile photos_;  // of the current directory, until its numbers are known
  ThumbShares directoryShares_;
  ThumbShares shares_;
  StatusTotals totals_;
  int64_t sections_ = 0;
};

}  // namespace vela
