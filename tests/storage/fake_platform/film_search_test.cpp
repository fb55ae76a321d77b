// What the film checks ask the index library, in which order, and what they make of answers that no
// real film gives. The library is played here.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cstdint>
#include <cstdio>
#include <limits>
#include <map>
#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "storage/velamk_util.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace {

struct FakeLibrary {
  std::map<std::string, int64_t> films;  ///< size of each by its current name
  int metadataResult = 0;
  int32_t rotation = 0;
  int directoryResult = 0;
  uint32_t bitrate = 0;
  int32_t recordWidth = 1;  ///< the height is 1
  std::vector<std::string> calls;

  bool Has(const char* name) const { return films.count(name) != 0; }
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
  if (sizeOut != nullptr) *sizeOut = g_library.films[name];
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
using ::testing::ElementsAreArray;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr const char* kVideo = "/tmp/a.mp4";
constexpr const char* kUnreadable =
    "velamk_util:213 Failed to get media metadata from file [/tmp/a.mp4].";

const std::string kHigh = "VELAPHOTO_FILM_H.mp4 VELAPHOTO:FILM_H.mp4";
const std::string kMedium = "VELAPHOTO_FILM_M.mp4 VELAPHOTO:FILM_M.mp4";
const std::string kLow = "VELAPHOTO_FILM_L.mp4 VELAPHOTO:FILM_L.mp4";
const std::string kMobile = "VELAPHOTO_FILM_MOBILE.mp4 VELAPHOTO:FILM_MOBILE.mp4";
const std::string kConversion = "VELAPHOTO_FILM_CONVERT_MPEG4.mp4 VELAPHOTO:FILM_CONVERT_MPEG4.mp4";
const std::string kH264 = "VELAPHOTO_FILM_H264.mp4 VELAPHOTO:FILM_H264.mp4";
const std::string kIphone = "VELAPHOTO_FILM_MOBILE_IPHONE VELAPHOTO:FILM_MOBILE_IPHONE";
const std::string kMpeg4 = "VELAPHOTO_FILM_MPEG4.mp4 VELAPHOTO:FILM_MPEG4.mp4";
const std::string kFlash = "VELAPHOTO_FILM.flv VELAPHOTO:FILM.flv";

std::string CurrentName(const std::string& bothNames) {
  return bothNames.substr(0, bothNames.find(' '));
}
std::string SizeOf(const std::string& film) {
  return "size of /fake " + film;
}
std::string ExistenceOf(const std::string& film) {
  return "existence of /tmp/a.mp4 " + film;
}
std::string PathOf(const std::string& film) {
  return "path of /tmp/a.mp4 " + film + " 4096";
}
std::string ResolutionOf(const std::string& film) {
  return "resolution of /fake/" + CurrentName(film);
}
std::string RemovalOf(const std::string& film) {
  return "removal of /tmp/a.mp4 " + film;
}
const std::string kDirectory = "directory of /tmp/a.mp4 0 4096";
const std::string kMetadata = "metadata of /tmp/a.mp4";
const std::string kRecord = "record of /tmp/a.mp4";

class FilmSearch : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    g_library = FakeLibrary();
  }

  static void Put(const std::string& film, int64_t size = 2) {
    g_library.films[CurrentName(film)] = size;
  }

  /// The library's calls of one check, which must answer `result`.
  static std::vector<std::string> CallsOf(int (*check)(const char*), int result) {
    g_library.calls.clear();
    EXPECT_EQ(check(kVideo), result);
    return g_library.calls;
  }
};

TEST_F(FilmSearch, OnlyQuarterTurnsAreRotations) {
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
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FilmSearch, TheRecordOfMetadataIsZeroedEachTime) {
  g_library.rotation = 90;
  IsVideoRotated(kVideo);
  IsVideoRotated(kVideo);
  EXPECT_THAT(g_library.calls, ElementsAre(kMetadata, kMetadata));
}

TEST_F(FilmSearch, MetadataFailsBelowZeroOnly) {
  g_library.rotation = 90;
  for (const int result : {-1, -7}) {
    SCOPED_TRACE(result);
    g_library.metadataResult = result;
    ClearLog();
    EXPECT_EQ(IsVideoRotated(kVideo), 0);
    EXPECT_THAT(ErrorLines(), ElementsAre(kUnreadable));
  }
  ClearLog();
  g_library.metadataResult = 1;
  EXPECT_EQ(IsVideoRotated(kVideo), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(FilmSearch, ADirectoryFailsWithAnyOtherAnswerThanZero) {
  for (const int result : {-1, 1}) {
    SCOPED_TRACE(result);
    g_library.directoryResult = result;
    EXPECT_THAT(CallsOf(IsWebVideoConverted, -1), ElementsAre(kDirectory));
    EXPECT_THAT(CallsOf(IsMobileVideoConverted, -1), ElementsAre(kDirectory));
  }
}

TEST_F(FilmSearch, SizesAreSignedAndOf64Bits) {
  constexpr int64_t kTwoTo32 = int64_t{1} << 32;
  for (const int64_t size :
       {int64_t{2}, kTwoTo32, kTwoTo32 + 1, kTwoTo32 / 2, std::numeric_limits<int64_t>::max()}) {
    SCOPED_TRACE(size);
    Put(kHigh, size);
    EXPECT_EQ(IsWebVideoConverted(kVideo), 1);
  }
  for (const int64_t size :
       {int64_t{1}, int64_t{0}, int64_t{-1}, std::numeric_limits<int64_t>::min()}) {
    SCOPED_TRACE(size);
    Put(kHigh, size);
    EXPECT_EQ(IsWebVideoConverted(kVideo), 0);
  }
}

TEST_F(FilmSearch, OfAnUprightVideoForBrowsers) {
  const std::vector<std::string> all = {kDirectory,      kMetadata,      SizeOf(kHigh),
                                        SizeOf(kMedium), SizeOf(kLow),   SizeOf(kMobile),
                                        SizeOf(kIphone), SizeOf(kFlash), SizeOf(kH264)};
  EXPECT_THAT(CallsOf(IsWebVideoConverted, 0), ElementsAreArray(all));
  // From the last film to the first: each ends the search where it stands.
  size_t place = all.size() - 1;
  for (const std::string& film : {kFlash, kIphone, kMobile, kLow, kMedium, kHigh}) {
    SCOPED_TRACE(film);
    Put(film);
    const std::vector<std::string> part(all.begin(), all.begin() + static_cast<long>(place--));
    EXPECT_THAT(CallsOf(IsWebVideoConverted, 1), ElementsAreArray(part));
  }
}

TEST_F(FilmSearch, OfAnUprightVideoForBrowsersWithAnH264Film) {
  Put(kH264);
  EXPECT_THAT(
      CallsOf(IsWebVideoConverted, 1),
      ElementsAre(kDirectory, kMetadata, SizeOf(kHigh), SizeOf(kMedium), SizeOf(kLow),
                  SizeOf(kMobile), SizeOf(kIphone), SizeOf(kFlash), SizeOf(kH264), kRecord));
}

TEST_F(FilmSearch, OfAnUprightVideoForMobileDevices) {
  std::vector<std::string> all = {kDirectory,           kMetadata,         ExistenceOf(kHigh),
                                  ExistenceOf(kMedium), ExistenceOf(kLow), ExistenceOf(kMobile),
                                  SizeOf(kH264),        SizeOf(kIphone),   SizeOf(kMpeg4),
                                  SizeOf(kConversion)};
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 0), ElementsAreArray(all));
  Put(kConversion);
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 1), ElementsAreArray(all));
  all.pop_back();
  Put(kMpeg4);
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 1), ElementsAreArray(all));
}

TEST_F(FilmSearch, OfAnUprightVideoForMobileDevicesWithJudgedFilms) {
  Put(kH264);
  Put(kIphone);
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 1),
              ElementsAre(kDirectory, kMetadata, ExistenceOf(kHigh), ExistenceOf(kMedium),
                          ExistenceOf(kLow), ExistenceOf(kMobile), SizeOf(kH264), kRecord));
  g_library.bitrate = 4500000;
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 0),
              ElementsAre(kDirectory, kMetadata, ExistenceOf(kHigh), ExistenceOf(kMedium),
                          ExistenceOf(kLow), ExistenceOf(kMobile), SizeOf(kH264), kRecord,
                          SizeOf(kIphone), kRecord, SizeOf(kMpeg4), SizeOf(kConversion)));
}

TEST_F(FilmSearch, EndsAtTheFirstFilmMadeInTheOrientation) {
  size_t count = 4;
  const std::vector<std::string> all = {ExistenceOf(kHigh), ExistenceOf(kMedium), ExistenceOf(kLow),
                                        ExistenceOf(kMobile)};
  for (const std::string& film : {kMobile, kLow, kMedium, kHigh}) {
    SCOPED_TRACE(film);
    Put(film, 0);
    const std::vector<std::string> part(all.begin(), all.begin() + static_cast<long>(count--));
    EXPECT_THAT(CallsOf(HasConvertedFilm, 1), ElementsAreArray(part));
  }
}

TEST_F(FilmSearch, OfAMatchingFilm) {
  EXPECT_THAT(CallsOf(HasMatchedConvertedFilm, 0),
              ElementsAre(PathOf(kHigh), PathOf(kMedium), PathOf(kLow), PathOf(kMobile)));
  Put(kLow);
  Put(kMobile);
  EXPECT_THAT(
      CallsOf(HasMatchedConvertedFilm, 1),
      ::testing::AnyOf(
          ElementsAre(PathOf(kHigh), PathOf(kMedium), PathOf(kLow), kRecord, ResolutionOf(kLow)),
          ElementsAre(PathOf(kHigh), PathOf(kMedium), PathOf(kLow), ResolutionOf(kLow), kRecord)));
}

class RotatedFilmSearch : public FilmSearch {
 protected:
  void SetUp() override {
    FilmSearch::SetUp();
    g_library.rotation = 90;
  }

  /// The removals of one check, which must answer `result`.
  static std::vector<std::string> RemovalsOf(int (*check)(const char*), int result) {
    std::vector<std::string> removals;
    for (const std::string& call : CallsOf(check, result)) {
      if (call.rfind("removal", 0) == 0) removals.push_back(call);
    }
    return removals;
  }
};

TEST_F(RotatedFilmSearch, WithoutFilms) {
  EXPECT_THAT(CallsOf(IsWebVideoConverted, 0),
              ElementsAre(kDirectory, kMetadata, ExistenceOf(kHigh), ExistenceOf(kMedium),
                          ExistenceOf(kLow), ExistenceOf(kMobile), ExistenceOf(kFlash)));
  EXPECT_THAT(CallsOf(IsMobileVideoConverted, 0),
              ElementsAre(kDirectory, kMetadata, ExistenceOf(kHigh), ExistenceOf(kMedium),
                          ExistenceOf(kLow), ExistenceOf(kMobile), ExistenceOf(kConversion)));
}

TEST_F(RotatedFilmSearch, RemovesTheFilmOfTheCheckAlone) {
  // Films are square, the record is portrait.
  g_library.recordWidth = 0;
  for (const std::string& film :
       {kHigh, kMedium, kLow, kMobile, kConversion, kH264, kIphone, kMpeg4, kFlash}) {
    Put(film);
  }
  // That a removal fails changes nothing.
  EXPECT_THAT(RemovalsOf(IsWebVideoConverted, 0), ElementsAre(RemovalOf(kFlash)));
  EXPECT_THAT(RemovalsOf(IsMobileVideoConverted, 0), ElementsAre(RemovalOf(kConversion)));
  EXPECT_THAT(RemovalsOf(IsVideoConverted, 0), ElementsAre(RemovalOf(kFlash)));
}

TEST_F(RotatedFilmSearch, RemovesNothingThatMatches) {
  Put(kFlash);
  Put(kConversion);
  EXPECT_THAT(RemovalsOf(IsWebVideoConverted, 1), IsEmpty());
  EXPECT_THAT(RemovalsOf(IsMobileVideoConverted, 1), IsEmpty());
}

TEST_F(RotatedFilmSearch, NeverLooksForTheOtherFilms) {
  const std::vector<std::string> others = {kH264, kIphone, kMpeg4};
  for (const std::string& film : others) {
    Put(film);
  }
  std::vector<std::string> calls = CallsOf(IsWebVideoConverted, 0);
  const std::vector<std::string> mobileCalls = CallsOf(IsMobileVideoConverted, 0);
  calls.insert(calls.end(), mobileCalls.begin(), mobileCalls.end());
  for (const std::string& film : others) {
    EXPECT_THAT(calls, Each(Not(HasSubstr(CurrentName(film)))));
  }
}

}  // namespace
}  // namespace vela_test
