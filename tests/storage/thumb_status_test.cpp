// The thumbnail status of one photo.
#include <gmock/gmock.h>

#include <ostream>
#include <string>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
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

TEST_F(PhotoStatus, CountsPresentAndMissingThumbs) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg");
  EXPECT_EQ(Status(kBitS | kBitM), (ThumbStatus{1, 1}));
  EXPECT_EQ(Status(kBitS), (ThumbStatus{0, 1}));
  EXPECT_EQ(Status(kBitM), (ThumbStatus{1, 0}));
  EXPECT_EQ(Status(63), (ThumbStatus{5, 1}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoStatus, KnowsEveryClassUnderBothNames) {
  for (int row = 0; row < 6; ++row) {
    for (const char* name : {kThumbNames[row], kOldThumbNames[row]}) {
      SCOPED_TRACE(name);
      EXPECT_EQ(Status(1 << row), (ThumbStatus{1, 0}));
      MakeDerived(name);
      EXPECT_EQ(Status(1 << row), (ThumbStatus{0, 1}));
      EXPECT_EQ(Status(63 & ~(1 << row)), (ThumbStatus{5, 0}));
      RemoveTree(Derived(name));
    }
  }
}

TEST_F(PhotoStatus, CountsNothingForAnEmptySizeMap) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg");
  EXPECT_EQ(Status(0), (ThumbStatus{0, 0}));
  EXPECT_EQ(Status(64), (ThumbStatus{0, 0}));
}

TEST_F(PhotoStatus, OutdatedThumbsAreMissing) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg", 10, -1);
  MakeDerived("VELAPHOTO:THUMB_M.jpg", 10, -1);
  MakeDerived("VELAPHOTO_THUMB_B.jpg", 0);
  MakeDerived("VELAPHOTO_THUMB_L.jpg", 10, 0);
  MakeDerived("VELAPHOTO_THUMB_XL.jpg", 1);
  EXPECT_EQ(Status(63), (ThumbStatus{4, 2}));
}

TEST_F(PhotoStatus, RemovesNothing) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg", 10, -1);
  MakeDerived("VELAPHOTO_THUMB_M.jpg", 0);
  MakeDerived("VELAPHOTO_THUMB_B.fail", 0);
  Status(63);
  EXPECT_THAT(ListDirectory(EaDir()), SizeIs(3));
}

TEST_F(PhotoStatus, TheCurrentNameGoesBeforeTheOlderOne) {
  MakeDerived("VELAPHOTO_THUMB_M.jpg", 10, -1);
  MakeDerived("VELAPHOTO:THUMB_M.jpg", 10, 1);
  EXPECT_EQ(Status(kBitM), (ThumbStatus{1, 0}));
}

TEST_F(PhotoStatus, ADirectoryIsNoThumb) {
  MakeDirectories(Derived("VELAPHOTO_THUMB_M.jpg"));
  EXPECT_EQ(Status(kBitM), (ThumbStatus{1, 0}));
}

TEST_F(PhotoStatus, AFailureMarkerIsNoThumb) {
  WriteFile(Derived("VELAPHOTO_THUMB_M.fail"), "");
  EXPECT_EQ(Status(kBitM), (ThumbStatus{1, 0}));
}

TEST_F(PhotoStatus, EverythingIsMissingWithoutMetadata) {
  RemoveTree("/tmp/media/@eaDir");
  EXPECT_EQ(Status(63), (ThumbStatus{6, 0}));
  EXPECT_FALSE(Exists("/tmp/media/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoStatus, AnUnknownSizeMapIsThatOfTheIndex) {
  MakeDerived("VELAPHOTO_THUMB_S.jpg");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{5, 1}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"3\"\nvideo_thumb_size_map=\"60\"\n");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{1, 1}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(Status(kAskTheIndex), (ThumbStatus{0, 0}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoStatus, AGivenSizeMapStands) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"3\"\n");
  EXPECT_EQ(Status(kBitB | kBitL | kBitXL), (ThumbStatus{3, 0}));
}

TEST_F(PhotoStatus, APhotoThatIsNotThereHasNone) {
  EXPECT_EQ(StatusOf("/tmp/media/b.jpg", 63), (ThumbStatus{0, 0}));
  EXPECT_EQ(StatusOf("/tmp/media", 63), (ThumbStatus{0, 0}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhotoStatus, AFileWithoutMetadataDirectoryHasNone) {
  const std::string inside = MakeDerived("VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(StatusOf(inside, 63), (ThumbStatus{0, 0}));
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + inside));
}

}  // namespace
}  // namespace vela_test
