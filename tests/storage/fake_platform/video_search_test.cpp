// The order in which the checks for converted videos call the index library, and how they handle
// answers that no real video causes. The library is faked.
#include <json/value.h>

#include <cstdint>
#include <cstdio>
#include <limits>
#include <map>

#include "platform/velaindex.h"
#include "storage/velamk_util.h"
#include "support/quiet_test.h"

using namespace vela;

namespace {

struct FakeLibrary {
  std::map<std::string, int64_t> videos;  ///< size of each by its current name
  int metadataResult = 0;
  int32_t rotation = 0;
  int directoryResult = 0;
  uint32_t bitrate = 0;
  int32_t recordWidth = 1;  ///< the height is 1
  std::vector<std::string> calls;

  bool Has(const char* name) const { return videos.count(name) != 0; }
  void Note(const std::string& call) { calls.push_back(call); }
};

FakeLibrary g_library;

}  // namespace

int VELAEADirPath(int flags, const char* path, char* out, size_t outSize) {
  g_library.Note("directory of " + std::string(path) + " " + std::to_string(flags) + " " +
                 std::to_string(outSize));
  std::snprintf(out, outSize, "/fake");
  return g_library.directoryResult;
}

const char* IsEAFileExist(const char* eaDir, int64_t* sizeOut, const char* name,
                          const char* oldName) {
  g_library.Note("size of " + std::string(eaDir) + " " + name + " " + oldName);
  if (!g_library.Has(name)) return nullptr;
  if (sizeOut != nullptr) *sizeOut = g_library.videos[name];
  return name;
}

int IsEAFileExist2(const char* path, const char* name, const char* oldName) {
  g_library.Note("existence of " + std::string(path) + " " + name + " " + oldName);
  return g_library.Has(name) ? 5 : 0;
}

int GetEAFilePath(const char* path, const char* name, const char* oldName, char* out,
                  size_t outSize) {
  g_library.Note("path of " + std::string(path) + " " + name + " " + oldName + " " +
                 std::to_string(outSize));
  std::snprintf(out, outSize, "/fake/%s", name);
  return g_library.Has(name) ? 0 : 1;
}

int RemoveEAFile(const char* eaDir, const char* name, const char* oldName) {
  g_library.Note("removal in " + std::string(eaDir) + " " + name + " " + oldName);
  return 0;
}

int RemoveEAFile2(const char* path, const char* name, const char* oldName) {
  g_library.Note("removal of " + std::string(path) + " " + name + " " + oldName);
  return -1;
}

int VELAIDX_GetVideoMetadata(const char* path, _VIDEO_METADATA_* metadata) {
  g_library.Note("metadata of " + std::string(path));
  const bool isZeroed =
      metadata->rotation == 0 && metadata->duration == 0 && metadata->bitrate == 0;
  if (!isZeroed) g_library.Note("metadata not zeroed");
  metadata->rotation = g_library.rotation;
  return g_library.metadataResult;
}

int VELAIDX_GetMediaResolution(const char* path, VELA_RESOLUTION* resolution) {
  g_library.Note("resolution of " + std::string(path));
  *resolution = {1, 1};
  return 0;
}

int AutoSendRecvPacket(const char* /*socketPath*/, int /*unused*/, Json::Value& packet,
                       int /*timeoutSeconds*/) {
  g_library.Note("record of " + packet["path"].asString());
  Json::Value media(Json::objectValue);
  media["width"] = g_library.recordWidth;
  media["height"] = 1;
  media["bitrate"] = g_library.bitrate;
  packet = Json::Value(Json::objectValue);
  packet["success"] = true;
  packet["media"] = media;
  return 0;
}

namespace vela_test {
namespace {

using ::testing::AnyOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr const char* kVideo = "/tmp/a.mp4";
constexpr const char* kUnreadable =
    "velamk_util:213 Failed to get media metadata from file [/tmp/a.mp4].";

using Calls = std::vector<std::string>;

/// Both names of a converted video, as they follow in the record of a call.
const std::string kHigh = "VELAPHOTO_FILM_H.mp4 VELAPHOTO:FILM_H.mp4";
const std::string kMedium = "VELAPHOTO_FILM_M.mp4 VELAPHOTO:FILM_M.mp4";
const std::string kLow = "VELAPHOTO_FILM_L.mp4 VELAPHOTO:FILM_L.mp4";
const std::string kMobile = "VELAPHOTO_FILM_MOBILE.mp4 VELAPHOTO:FILM_MOBILE.mp4";
const std::string kConversion = "VELAPHOTO_FILM_CONVERT_MPEG4.mp4 VELAPHOTO:FILM_CONVERT_MPEG4.mp4";
const std::string kH264 = "VELAPHOTO_FILM_H264.mp4 VELAPHOTO:FILM_H264.mp4";
const std::string kIphone = "VELAPHOTO_FILM_MOBILE_IPHONE VELAPHOTO:FILM_MOBILE_IPHONE";
const std::string kMpeg4 = "VELAPHOTO_FILM_MPEG4.mp4 VELAPHOTO:FILM_MPEG4.mp4";
const std::string kFlash = "VELAPHOTO_FILM.flv VELAPHOTO:FILM.flv";

const Calls kOriented = {kHigh, kMedium, kLow, kMobile};
const Calls kAll = {kHigh, kMedium, kLow, kMobile, kConversion, kH264, kIphone, kMpeg4, kFlash};

const std::string kRecord = "record of /tmp/a.mp4";
const std::string kMetadata = "metadata of /tmp/a.mp4";
const std::string kDirectory = "directory of /tmp/a.mp4 0 4096";
const Calls kStart = {kDirectory, kMetadata};

std::string CurrentName(const std::string& bothNames) {
  return bothNames.substr(0, bothNames.find(' '));
}

/// The calls "`before`<both names>`after`" for each of the videos.
Calls CallsFor(const Calls& videos, const std::string& before, const std::string& after = "") {
  Calls calls;
  for (const std::string& video : videos) {
    calls.push_back(before + video + after);
  }
  return calls;
}
Calls SizesOf(const Calls& videos) {
  return CallsFor(videos, "size of /fake ");
}
Calls ExistencesOf(const Calls& videos) {
  return CallsFor(videos, "existence of /tmp/a.mp4 ");
}
Calls PathsOf(const Calls& videos) {
  return CallsFor(videos, "path of /tmp/a.mp4 ", " 4096");
}
Calls RemovalOf(const std::string& video) {
  return {"removal of /tmp/a.mp4 " + video};
}

Calls operator+(Calls first, const Calls& second) {
  first.insert(first.end(), second.begin(), second.end());
  return first;
}

/// The first `count` of the calls.
Calls Beginning(const Calls& calls, size_t count) {
  return Calls(calls.begin(), calls.begin() + static_cast<long>(count));
}

class VideoSearch : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_library = FakeLibrary();
  }

  static void Put(const Calls& videos, int64_t size = 2) {
    for (const std::string& video : videos) {
      g_library.videos[CurrentName(video)] = size;
    }
  }

  /// The library's calls of one check, which must return `result`.
  static Calls CallsOf(int (*check)(const char*), int result) {
    g_library.calls.clear();
    EXPECT_EQ(check(kVideo), result);
    return g_library.calls;
  }

  /// The same for the calls that remove a video.
  static Calls RemovalsOf(int (*check)(const char*), int result) {
    Calls removals;
    for (const std::string& call : CallsOf(check, result)) {
      if (call.rfind("removal", 0) == 0) {
        removals.push_back(call);
      }
    }
    return removals;
  }
};

TEST_F(VideoSearch, OnlyQuarterTurnsAreRotations) {
  for (const int32_t rotation : {90, 180, 270}) {
    SCOPED_TRACE(rotation);
    g_library.rotation = rotation;
    EXPECT_EQ(IsVideoRotated(kVideo), 1);
  }
  for (const int32_t rotation :
       {0, 1, 45, 89, 91, 179, 181, 269, 271, 360, 450, -90, -180, -270,
        std::numeric_limits<int32_t>::max(), std::numeric_limits<int32_t>::min()}) {
    SCOPED_TRACE(rotation);
    g_library.rotation = rotation;
    EXPECT_EQ(IsVideoRotated(kVideo), 0);
  }
}

TEST_F(VideoSearch, TheRecordOfMetadataIsZeroedEachTime) {
  g_library.rotation = 90;
  IsVideoRotated(kVideo);
  IsVideoRotated(kVideo);
  EXPECT_THAT(g_library.calls, ElementsAre(kMetadata, kMetadata));
}

TEST_F(VideoSearch, MetadataFailsBelowZeroOnly) {
  g_library.rotation = 90;
  for (const int result : {-1, -7}) {
    SCOPED_TRACE(result);
    g_library.metadataResult = result;
    EXPECT_EQ(IsVideoRotated(kVideo), 0);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadable));
  }
  g_library.metadataResult = 1;
  EXPECT_EQ(IsVideoRotated(kVideo), 1);
}

TEST_F(VideoSearch, ADirectoryFailsWithAnyOtherAnswerThanZero) {
  for (const int result : {-1, 1}) {
    SCOPED_TRACE(result);
    g_library.directoryResult = result;
    EXPECT_EQ(CallsOf(IsWebVideoConverted, -1), Calls{kDirectory});
    EXPECT_EQ(CallsOf(IsMobileVideoConverted, -1), Calls{kDirectory});
    EXPECT_THAT(TakeErrorLines(), ElementsAre(StartsWith("velamk_util:465 VELAEADirPath error"),
                                              StartsWith("velamk_util:413 VELAEADirPath error")));
  }
}

TEST_F(VideoSearch, SizesAreSignedAndOf64Bits) {
  constexpr int64_t kTwoTo32 = int64_t{1} << 32;
  const struct {
    int64_t size;
    int isConverted;
  } cases[] = {{2, 1},
               {kTwoTo32, 1},
               {kTwoTo32 + 1, 1},
               {kTwoTo32 / 2, 1},
               {std::numeric_limits<int64_t>::max(), 1},
               {1, 0},
               {0, 0},
               {-1, 0},
               {std::numeric_limits<int64_t>::min(), 0}};
  for (const auto& c : cases) {
    Put({kHigh}, c.size);
    EXPECT_EQ(IsWebVideoConverted(kVideo), c.isConverted) << c.size;
  }
}

TEST_F(VideoSearch, OfAnUprightVideoForBrowsers) {
  const Calls all = kStart + SizesOf({kHigh, kMedium, kLow, kMobile, kIphone, kFlash, kH264});
  EXPECT_EQ(CallsOf(IsWebVideoConverted, 0), all);
  Put({kH264});
  EXPECT_EQ(CallsOf(IsWebVideoConverted, 1), all + Calls{kRecord});
  // Each of the others ends the search at its position.
  size_t place = all.size() - 1;
  for (const std::string& video : {kFlash, kIphone, kMobile, kLow, kMedium, kHigh}) {
    SCOPED_TRACE(video);
    Put({video});
    EXPECT_EQ(CallsOf(IsWebVideoConverted, 1), Beginning(all, place--));
  }
}

TEST_F(VideoSearch, OfAnUprightVideoForMobileDevices) {
  const Calls all =
      kStart + ExistencesOf(kOriented) + SizesOf({kH264, kIphone, kMpeg4, kConversion});
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 0), all);
  Put({kConversion});
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 1), all);
  Put({kMpeg4});
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 1), Beginning(all, all.size() - 1));
}

TEST_F(VideoSearch, OfAnUprightVideoForMobileDevicesByItsBitrate) {
  Put({kH264, kIphone});
  const Calls start = kStart + ExistencesOf(kOriented) + SizesOf({kH264}) + Calls{kRecord};
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 1), start);
  g_library.bitrate = 4500000;
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 0),
            start + SizesOf({kIphone}) + Calls{kRecord} + SizesOf({kMpeg4, kConversion}));
}

TEST_F(VideoSearch, EndsAtTheFirstOrientedVideo) {
  size_t count = 4;
  for (const std::string& video : {kMobile, kLow, kMedium, kHigh}) {
    SCOPED_TRACE(video);
    Put({video}, 0);
    EXPECT_EQ(CallsOf(HasConvertedFilm, 1), Beginning(ExistencesOf(kOriented), count--));
  }
}

TEST_F(VideoSearch, OfAMatchingVideo) {
  EXPECT_EQ(CallsOf(HasMatchedConvertedFilm, 0), PathsOf(kOriented));
  Put({kLow, kMobile});
  const Calls paths = PathsOf({kHigh, kMedium, kLow});
  const std::string resolution = "resolution of /fake/" + CurrentName(kLow);
  EXPECT_THAT(CallsOf(HasMatchedConvertedFilm, 1),
              AnyOf(paths + Calls{kRecord, resolution}, paths + Calls{resolution, kRecord}));
}

class RotatedVideoSearch : public VideoSearch {
 protected:
  void SetUp() override {
    VideoSearch::SetUp();
    g_library.rotation = 90;
  }
};

TEST_F(RotatedVideoSearch, LooksForFiveVideosOnly) {
  Put({kH264, kIphone, kMpeg4});
  const Calls start = kStart + ExistencesOf(kOriented);
  EXPECT_EQ(CallsOf(IsWebVideoConverted, 0), start + ExistencesOf({kFlash}));
  EXPECT_EQ(CallsOf(IsMobileVideoConverted, 0), start + ExistencesOf({kConversion}));
}

TEST_F(RotatedVideoSearch, RemovesTheVideoOfTheCheckOnly) {
  // The converted videos are square, the record is portrait.
  g_library.recordWidth = 0;
  Put(kAll);
  // The fake removals fail, which changes nothing.
  EXPECT_EQ(RemovalsOf(IsWebVideoConverted, 0), RemovalOf(kFlash));
  EXPECT_EQ(RemovalsOf(IsMobileVideoConverted, 0), RemovalOf(kConversion));
  EXPECT_EQ(RemovalsOf(IsVideoConverted, 0), RemovalOf(kFlash));
}

TEST_F(RotatedVideoSearch, RemovesNothingThatMatches) {
  Put({kFlash, kConversion});
  EXPECT_THAT(RemovalsOf(IsWebVideoConverted, 1), IsEmpty());
  EXPECT_THAT(RemovalsOf(IsMobileVideoConverted, 1), IsEmpty());
}

}  // namespace
}  // namespace vela_test
