// The thumbnail status of one photo.
#include <ostream>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/named_case.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::SizeIs;

constexpr int kAskTheIndex = -1;

struct ThumbStatus {
  int missing = -77;
  int present = -77;
};
bool operator==(const ThumbStatus& a, const ThumbStatus& b) {
  return a.missing == b.missing && a.present == b.present;
}
void PrintTo(const ThumbStatus& status, std::ostream* out) {
  *out << status.missing << " missing, " << status.present << " present";
}

ThumbStatus StatusOf(const std::string& path, int sizeMap) {
  ThumbStatus status;
  GetThumbStatus(path.c_str(), &status.missing, &status.present, sizeMap);
  return status;
}

class PhotoStatus : public MediaTest {
 protected:
  PhotoStatus() : MediaTest("a.jpg") {}

  ThumbStatus Status(int sizeMap) const { return StatusOf(Media(), sizeMap); }
};

struct DerivedFile {
  const char* name;
  size_t bytes = 10;
  int64_t seconds = 1;  ///< its age relative to the photo
};

struct StatusCase : NamedCase {
  std::vector<DerivedFile> files;
  int sizeMap;
  ThumbStatus status;
};

class StatusCases : public PhotoStatus, public ::testing::WithParamInterface<StatusCase> {};

TEST_P(StatusCases, AreCounted) {
  for (const DerivedFile& file : GetParam().files) {
    MakeDerived(file.name, file.bytes, file.seconds);
  }
  EXPECT_EQ(Status(GetParam().sizeMap), GetParam().status);
  EXPECT_THAT(Left(), SizeIs(GetParam().files.size())) << "files were removed";
}

const StatusCase kCases[] = {
    {"OnePresentOneMissing", {{kThumbNames[0]}}, kBitS | kBitM, {1, 1}},
    {"OnePresent", {{kThumbNames[0]}}, kBitS, {0, 1}},
    {"OneMissing", {{kThumbNames[0]}}, kBitM, {1, 0}},
    {"AllSizes", {{kThumbNames[0]}}, 63, {5, 1}},
    {"EmptySizeMap", {{kThumbNames[0]}}, 0, {0, 0}},
    {"SizeMapOfOtherBits", {{kThumbNames[0]}}, 64, {0, 0}},
    {"OutdatedAndEmptyThumbsAreMissing",
     {{kThumbNames[0], 10, -1},
      {kOldThumbNames[1], 10, -1},
      {kThumbNames[2], 0},
      {kThumbNames[3], 10, 0},
      {kThumbNames[4], 1}},
     63,
     {4, 2}},
    {"OutdatedCurrentName", {{kThumbNames[1], 10, -1}, {kOldThumbNames[1]}}, kBitM, {1, 0}},
    {"FailureMarkerIsNoThumb", {{"VELAPHOTO_THUMB_M.fail", 0}}, kBitM, {1, 0}},
};
INSTANTIATE_TEST_SUITE_P(Photo, StatusCases, ::testing::ValuesIn(kCases), CaseName());

TEST_F(PhotoStatus, KnowsEveryClassUnderBothNames) {
  for (int row = 0; row < 6; ++row) {
    for (const char* name : {kThumbNames[row], kOldThumbNames[row]}) {
      SCOPED_TRACE(name);
      EXPECT_EQ(Status(1 << row), (ThumbStatus{1, 0}));
      MakeDerived(name);
      EXPECT_EQ(Status(1 << row), (ThumbStatus{0, 1}));
      EXPECT_EQ(Status(63 & ~(1 << row)), (ThumbStatus{5, 0}));
      Remove(name);
    }
  }
}

TEST_F(PhotoStatus, ADirectoryIsNoThumb) {
  MakeDirectories(Derived("VELAPHOTO_THUMB_M.jpg"));
  EXPECT_EQ(Status(kBitM), (ThumbStatus{1, 0}));
}

TEST_F(PhotoStatus, EverythingIsMissingWithoutMetadata) {
  RemoveTree("/tmp/media/@eaDir");
  EXPECT_EQ(Status(63), (ThumbStatus{6, 0}));
  EXPECT_FALSE(Exists("/tmp/media/@eaDir"));
}

TEST_F(PhotoStatus, AnUnknownSizeMapIsThatOfTheIndex) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{5, 1}));
  WriteFile(kSettings, "photo_thumb_size_map=\"3\"\nvideo_thumb_size_map=\"60\"\n");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{1, 1}));
  WriteFile(kSettings, "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{0, 0}));
}

TEST_F(PhotoStatus, AGivenSizeMapIsUsed) {
  WriteFile(kSettings, "photo_thumb_size_map=\"3\"\n");
  EXPECT_EQ(Status(kBitB | kBitL | kBitXL), (ThumbStatus{3, 0}));
}

TEST_F(PhotoStatus, AMissingPhotoHasNone) {
  EXPECT_EQ(StatusOf("/tmp/media/b.jpg", 63), (ThumbStatus{0, 0}));
  EXPECT_EQ(StatusOf("/tmp/media", 63), (ThumbStatus{0, 0}));
}

TEST_F(PhotoStatus, AFileWithoutMetadataDirectoryHasNone) {
  const std::string inside = MakeDerived("VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(StatusOf(inside, 63), (ThumbStatus{0, 0}));
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + inside));
}

}  // namespace
}  // namespace vela_test
