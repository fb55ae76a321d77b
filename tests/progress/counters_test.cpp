// The progress counters and their summary in the system log.
#include <climits>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/quiet_test.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr const char* kVideoFile = "/var/spool/conv_progress_video";

class Counters : public QuietTest {};

TEST_F(Counters, EachKindHasItsOwnFile) {
  WriteFile(kPhotoFile,
            "total=\"11\"\ncompleted=\"12\"\ntotal_thumb=\"13\"\ncompleted_thumb=\"14\"\n");
  WriteFile(kVideoFile,
            "total=\"21\"\ncompleted=\"22\"\ntotal_thumb=\"23\"\ncompleted_thumb=\"24\"\n");
  EXPECT_EQ(GetConvProgress(1, "total"), 11);
  EXPECT_EQ(GetConvProgress(1, "completed"), 12);
  EXPECT_EQ(GetConvProgress(1, "total_thumb"), 13);
  EXPECT_EQ(GetConvProgress(1, "completed_thumb"), 14);
  EXPECT_EQ(GetConvProgress(2, "total"), 21);
  EXPECT_EQ(GetConvProgress(2, "completed"), 22);
  EXPECT_EQ(GetConvProgress(2, "total_thumb"), 23);
  EXPECT_EQ(GetConvProgress(2, "completed_thumb"), 24);
}

TEST_F(Counters, AnotherKindAndANullKeyReadAsZero) {
  WriteFile(kPhotoFile, "total=\"11\"\n");
  WriteFile(kVideoFile, "total=\"21\"\n");
  for (const int kind : {0, 3, -1, INT_MAX}) {
    EXPECT_EQ(GetConvProgress(kind, "total"), 0) << kind;
  }
  EXPECT_EQ(GetConvProgress(1, nullptr), 0);
}

TEST_F(Counters, AValueIsReadAsALeadingNumber) {
  const struct {
    std::string value;
    int count;
  } cases[] = {{"", 0},
               {"abc", 0},
               {"x12", 0},
               {"12x7", 12},
               {"-8", -8},
               {"+8", 8},
               {"  9", 9},
               {"010", 10},
               {"0x10", 0},
               {"3.9", 3},
               {"99999999999999999999", INT_MAX},
               {std::string(4094, '0') + "5", 5},
               {std::string(4095, '0') + "5", 0}};  // truncated at the buffer
  for (const auto& c : cases) {
    WriteFile(kPhotoFile, "key=\"" + c.value + "\"\n");
    EXPECT_EQ(GetConvProgress(1, "key"), c.count) << c.value;
  }
  EXPECT_EQ(GetConvProgress(1, "missing"), 0);
}

TEST_F(Counters, ReadingWithoutAFileIsSilent) {
  EXPECT_EQ(GetConvProgress(1, "total"), 0);
  MakeDirectories(kVideoFile);
  EXPECT_EQ(GetConvProgress(2, "total"), 0);
  EXPECT_FALSE(Exists(kPhotoFile));
}

TEST_F(Counters, AddingToAMissingFileMakesIt) {
  AddConvProgress(1, "completed", 1);
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"1\"\n");
  EXPECT_FALSE(Exists(kVideoFile));
  AddConvProgress(2, "completed_thumb", 7);
  EXPECT_EQ(ReadFile(kVideoFile), "completed_thumb=\"7\"\n");
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"1\"\n");
}

TEST_F(Counters, AddingChangesOneValueOnly) {
  const struct {
    const char* before;
    int delta;
    const char* after;
  } cases[] = {
      {"total=\"9\"\n", 1, "total=\"9\"\ncompleted=\"1\"\n"},
      {"# set by the index\ntotal = 9\n\ncompleted=\"41\"\ncompleted_thumb=5\n", 1,
       "# set by the index\ntotal = 9\n\ncompleted=\"42\"\ncompleted_thumb=5\n"},
      {"completed=\"3\"\n", -5, "completed=\"-2\"\n"},
      {"completed=\"-2\"\n", 0, "completed=\"-2\"\n"},
      {"completed=\"-2\"\n", 100, "completed=\"98\"\n"},
      {"completed=\"abc\"\n", 4, "completed=\"4\"\n"},
      {"completed=\"\"\n", -4, "completed=\"-4\"\n"},
      {"completed=\"12 of 20\"\n", 1, "completed=\"13\"\n"},
      {"completed=\"2147483647\"\n", 1, "completed=\"2147483647\"\n"},
      {"completed=\"-2147483648\"\n", -1, "completed=\"-2147483648\"\n"},
  };
  for (const auto& c : cases) {
    WriteFile(kPhotoFile, c.before);
    AddConvProgress(1, "completed", c.delta);
    EXPECT_EQ(ReadFile(kPhotoFile), c.after) << c.before << c.delta;
  }
}

TEST_F(Counters, AnotherKindAndANullKeyChangeNothing) {
  for (const int kind : {0, 3, -1}) {
    AddConvProgress(kind, "completed", 1);
  }
  AddConvProgress(1, nullptr, 1);
  AddConvProgress(2, nullptr, 1);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(Counters, AFailedWriteIsLoggedAndDropped) {
  const char* photoLine =
      "velamk_progress:115 VLIBCFileSetKeyValue fail: /var/spool/conv_progress_photo";
  const char* videoLine =
      "velamk_progress:115 VLIBCFileSetKeyValue fail: /var/spool/conv_progress_video";
  WriteFile(kPhotoFile, "completed=\"3\"\n");
  {
    const ReadOnlyMount spool("/var/spool");
    AddConvProgress(1, "completed", 1);
    AddConvProgress(2, "completed", 1);
  }
  EXPECT_THAT(TakeErrorLines(), ElementsAre(photoLine, videoLine));
  EXPECT_EQ(ReadFile(kPhotoFile), "completed=\"3\"\n");
  EXPECT_FALSE(Exists(kVideoFile));
  MakeDirectories(kVideoFile);
  AddConvProgress(2, "completed", 1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(videoLine));
}

class Summary : public Counters {
 protected:
  /// Logs the summary of these files; returns the lines after the title.
  static std::vector<std::string> Lines(const std::string& photos, const std::string& videos = "") {
    WriteFile(kPhotoFile, photos);
    WriteFile(kVideoFile, videos);
    return LoggedLines();
  }

  static std::vector<std::string> LoggedLines() {
    LogConvProgress();
    std::vector<std::string> lines = TakeErrorLines();
    EXPECT_EQ(lines.at(0), "velamk_progress:144 ========== Convert Progress ==========");
    lines.erase(lines.begin());
    return lines;
  }

  /// The photo line of the summary for these two values.
  static std::string PhotoLine(const std::string& total, const std::string& completed) {
    const auto lines = Lines("total=\"" + total + "\"\ncompleted=\"" + completed + "\"\n");
    EXPECT_EQ(lines.size(), 3U);
    return lines.at(0);
  }
};

TEST_F(Summary, IsZeroWithoutFiles) {
  EXPECT_THAT(LoggedLines(),
              ElementsAre("velamk_progress:145 total_photo: 0, complete_photo: 0, progress: 0.00",
                          "velamk_progress:146 total_thumb: 0, complete_thumb: 0, progress: 0.00",
                          "velamk_progress:147 total_video: 0, complete_video: 0, progress: 0.00"));
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(Summary, EveryLineHasItsOwnCounters) {
  EXPECT_THAT(
      Lines("total=\"8\"\ncompleted=\"2\"\ntotal_thumb=\"1000\"\ncompleted_thumb=\"333\"\n",
            "total=\"3\"\ncompleted=\"3\"\ntotal_thumb=\"77\"\ncompleted_thumb=\"7\"\n"),
      ElementsAre("velamk_progress:145 total_photo: 8, complete_photo: 2, progress: 0.25",
                  "velamk_progress:146 total_thumb: 1000, complete_thumb: 333, progress: 0.33",
                  "velamk_progress:147 total_video: 3, complete_video: 3, progress: 1.00"));
}

TEST_F(Summary, ATotalOfZeroMeansNoProgress) {
  EXPECT_THAT(Lines("total=\"0\"\ncompleted=\"5\"\ncompleted_thumb=\"6\"\n", "completed=\"7\"\n"),
              ElementsAre("velamk_progress:145 total_photo: 0, complete_photo: 5, progress: 0.00",
                          "velamk_progress:146 total_thumb: 0, complete_thumb: 6, progress: 0.00",
                          "velamk_progress:147 total_video: 0, complete_video: 7, progress: 0.00"));
}

TEST_F(Summary, RatiosAreRoundedToTwoPlaces) {
  EXPECT_THAT(PhotoLine("3", "2"), ::testing::HasSubstr("progress: 0.67"));
  EXPECT_THAT(PhotoLine("1000", "994"), ::testing::HasSubstr("progress: 0.99"));
  EXPECT_THAT(PhotoLine("1000", "996"), ::testing::HasSubstr("progress: 1.00"));
  EXPECT_THAT(PhotoLine("2", "5"), ::testing::HasSubstr("progress: 2.50"));
  EXPECT_THAT(PhotoLine("-4", "2"), ::testing::HasSubstr("progress: -0.50"));
  // 1/200 is just below 0.005 in single precision and just above it in double precision.
  EXPECT_EQ(PhotoLine("200", "1"),
            "velamk_progress:145 total_photo: 200, complete_photo: 1, progress: 0.00");
}

}  // namespace
}  // namespace vela_test
