// The result of one comparison, and its line for the table of results.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// One thumbnail, ours compared with ImageMagick's; or a whole run, when one of them made no
/// thumbnails.
struct LikenessResult {
  std::string format;       ///< of the input
  std::string description;  ///< of the input
  std::string vector;
  std::string output;  ///< file name, empty for a whole run
  int ourExit = 0;
  int theirExit = 0;
  std::string ourSize;  ///< such as "640x480", empty when there is no picture
  std::string theirSize;
  double decibels = 0;      ///< meaningful for two pictures of one size
  std::string differences;  ///< other than the pixels
  std::string remark;       ///< why a difference is acceptable
};

/// Whether two pictures were compared.
bool HasLikeness(const LikenessResult& result);

/// The directory of the results, as a path outside the sandbox.
std::string ResultsDirectory();

/// Replaces the stored results of an input by these, one line each with tabs between the fields.
/// Nothing is stored when the directory is not writable; the comparison continues.
void KeepResults(const std::string& testName, const std::vector<LikenessResult>& results);

}  // namespace vela_test
