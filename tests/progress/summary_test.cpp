// The progress summary in the system log.
#include <gmock/gmock.h>

#include <string>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr const char* kVideoFile = "/var/spool/conv_progress_video";
constexpr const char* kTitle = "velamk_progress:144 ========== Convert Progress ==========";

class Summary : public SandboxTest {
 protected:
  /// The photo line of the summary for these two values.
  static std::string PhotoLine(const std::string& total, const std::string& completed) {
    WriteFile(kPhotoFile, "total=\"" + total + "\"\ncompleted=\"" + completed + "\"\n");
    ClearLog();
    LogConvProgress();
    const auto lines = ErrorLines();
    EXPECT_EQ(lines.size(), 4U);
    return lines.size() < 2 ? std::string() : lines[1];
  }
};

TEST_F(Summary, WithoutAnyFileEverythingIsZero) {
  LogConvProgress();
  EXPECT_THAT(
      ErrorLines(),
      ElementsAre(kTitle, "velamk_progress:145 total_photo: 0, complete_photo: 0, progress: 0.00",
                  "velamk_progress:146 total_thumb: 0, complete_thumb: 0, progress: 0.00",
                  "velamk_progress:147 total_video: 0, complete_video: 0, progress: 0.00"));
}

TEST_F(Summary, EveryLineHasItsOwnCounters) {
  WriteFile(kPhotoFile,
            "total=\"8\"\ncompleted=\"2\"\ntotal_thumb=\"1000\"\ncompleted_thumb=\"333\"\n");
  WriteFile(kVideoFile,
            "total=\"3\"\ncompleted=\"3\"\ntotal_thumb=\"77\"\ncompleted_thumb=\"7\"\n");
  LogConvProgress();
  EXPECT_THAT(
      ErrorLines(),
      ElementsAre(kTitle, "velamk_progress:145 total_photo: 8, complete_photo: 2, progress: 0.25",
                  "velamk_progress:146 total_thumb: 1000, complete_thumb: 333, progress: 0.33",
                  "velamk_progress:147 total_video: 3, complete_video: 3, progress: 1.00"));
}

TEST_F(Summary, ATotalOfZeroIsNoProgress) {
  WriteFile(kPhotoFile, "total=\"0\"\ncompleted=\"5\"\ncompleted_thumb=\"6\"\n");
  WriteFile(kVideoFile, "completed=\"7\"\n");
  LogConvProgress();
  EXPECT_THAT(
      ErrorLines(),
      ElementsAre(kTitle, "velamk_progress:145 total_photo: 0, complete_photo: 5, progress: 0.00",
                  "velamk_progress:146 total_thumb: 0, complete_thumb: 6, progress: 0.00",
                  "velamk_progress:147 total_video: 0, complete_video: 7, progress: 0.00"));
}

TEST_F(Summary, RatiosAreRoundedToTwoPlaces) {
  EXPECT_THAT(PhotoLine("3", "2"), HasSubstr("progress: 0.67"));
  EXPECT_THAT(PhotoLine("1000", "994"), HasSubstr("progress: 0.99"));
  EXPECT_THAT(PhotoLine("1000", "996"), HasSubstr("progress: 1.00"));
  EXPECT_THAT(PhotoLine("2", "5"), HasSubstr("progress: 2.50"));
  EXPECT_THAT(PhotoLine("-4", "2"), HasSubstr("progress: -0.50"));
}

TEST_F(Summary, RatiosAreInSinglePrecision) {
  // 1/200 lies just below 0.005 in single precision and just above it in double precision.
  EXPECT_EQ(PhotoLine("200", "1"),
            "velamk_progress:145 total_photo: 200, complete_photo: 1, progress: 0.00");
}

TEST_F(Summary, TheFilesStayAsTheyAre) {
  LogConvProgress();
  EXPECT_THAT(ListDirectory("/var/spool"), ::testing::IsEmpty());
}

}  // namespace
}  // namespace vela_test
