// Whether a derived file has to be made again.
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "platform/vlibc.h"
#include "storage/media_fixture.h"
#include "storage/velamk_util.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;

constexpr const char* kName = "VELAPHOTO_THUMB_M.jpg";

class ThumbOutdated : public MediaTest {
 protected:
  ThumbOutdated() : MediaTest("a.jpg") {}

  int Outdated(const std::string& name = kName) const {
    return IsEAThumbOutdated(Media().c_str(), name.c_str());
  }
};

TEST_F(ThumbOutdated, AMissingThumbIs) {
  EXPECT_EQ(Outdated(), 1);
  RemoveTree(EaDir());
  EXPECT_EQ(Outdated(), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ThumbOutdated, AnOlderThumbIs) {
  MakeDerived(kName, 10, -1);
  EXPECT_EQ(Outdated(), 1);
}

TEST_F(ThumbOutdated, AThumbOfTheSameAgeIsNot) {
  MakeDerived(kName, 10, 0);
  EXPECT_EQ(Outdated(), 0);
}

TEST_F(ThumbOutdated, AYoungerThumbIsNot) {
  MakeDerived(kName, 10, 1);
  EXPECT_EQ(Outdated(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ThumbOutdated, OnlyWholeSecondsCount) {
  MakeDerived(kName);
  SetFileTime(Media(), kMediaTime, 999999999);
  SetFileTime(Derived(kName), kMediaTime, 0);
  EXPECT_EQ(Outdated(), 0);
}

TEST_F(ThumbOutdated, AnEmptyThumbIs) {
  MakeDerived(kName, 0);
  EXPECT_EQ(Outdated(), 1);
}

TEST_F(ThumbOutdated, OneByteIsEnough) {
  MakeDerived(kName, 1, 0);
  EXPECT_EQ(Outdated(), 0);
}

TEST_F(ThumbOutdated, LargeFilesAreNotEmpty) {
  for (const off_t size : {off_t{1} << 31, off_t{3} << 30, off_t{1} << 32}) {
    MakeDerived(kName);
    ASSERT_EQ(truncate(Derived(kName).c_str(), size), 0);  // sparse
    EXPECT_EQ(Outdated(), 0) << size;
  }
}

TEST_F(ThumbOutdated, AnyDerivedFileCanBeAskedFor) {
  MakeDerived("film.mp4");
  MakeDerived("VELAPHOTO:THUMB_M.jpg", 10, -1);
  EXPECT_EQ(Outdated("film.mp4"), 0);
  EXPECT_EQ(Outdated("VELAPHOTO:THUMB_M.jpg"), 1);
  EXPECT_EQ(Outdated(kName), 1);
}

TEST_F(ThumbOutdated, LinksAreFollowed) {
  MakeDerived(kName, 10, 5);
  const std::string target = "/tmp/media/target.jpg";
  CopyFile(Media(), target);
  SetFileTime(target, kMediaTime + 6);
  ASSERT_EQ(unlink(Media().c_str()), 0);
  ASSERT_EQ(symlink(target.c_str(), Media().c_str()), 0);
  EXPECT_EQ(Outdated(), 1);
  SetFileTime(target, kMediaTime + 5);
  EXPECT_EQ(Outdated(), 0);

  const std::string moved = "/tmp/media/moved.jpg";
  ASSERT_EQ(rename(Derived(kName).c_str(), moved.c_str()), 0);
  ASSERT_EQ(symlink(moved.c_str(), Derived(kName).c_str()), 0);
  EXPECT_EQ(Outdated(), 0);
  WriteFile(moved, "");
  EXPECT_EQ(Outdated(), 1);
}

TEST_F(ThumbOutdated, AThumbOfAPhotoThatIsGoneIsNot) {
  MakeDerived(kName, 0, -1);
  RemoveTree(Media());
  EXPECT_EQ(Outdated(), 0);
  RemoveTree(EaDir());
  EXPECT_EQ(Outdated(), 0);
  const std::string line = "velamk_util:64 Fail to get /tmp/media/a.jpg file information";
  EXPECT_THAT(ErrorLines(), ElementsAre(line, line));
}

TEST_F(ThumbOutdated, AFileWithoutMetadataDirectoryIsNot) {
  MakeDirectories("/tmp/media/folder");
  const std::string inside = MakeDerived("inside.jpg");
  const std::string tooLong = PathOfLength(4089, "long.jpg");
  WriteFile(tooLong, "media");
  for (const std::string& path : {std::string("/tmp/media/folder/"), inside, tooLong}) {
    SCOPED_TRACE(path);
    ClearLog();
    EXPECT_EQ(IsEAThumbOutdated(path.c_str(), kName), 0);
    char expected[8192];
    std::snprintf(expected, sizeof expected,
                  "velamk_util:69 VELAEADirPath error [0x%04X %s:%d] on %s",
                  static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(), VLIBCErrorGetLine(),
                  path.c_str());
    EXPECT_THAT(ErrorLines(), ElementsAre(expected));
    EXPECT_THAT(ErrorLines(),
                ElementsAre(MatchesRegex("velamk_util:69 VELAEADirPath error "
                                         "\\[0x[0-9A-F]{4} [^ :]+:[1-9][0-9]*\\] on /tmp/.*")));
    EXPECT_NE(VLIBCErrGet(), 0);
  }
}

TEST_F(ThumbOutdated, TheLongestMetadataDirectoryFits) {
  const std::string media = PathOfLength(4088, "long.jpg");
  WriteFile(media, "media");
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ThumbOutdated, PathsOfDerivedFilesAreCutAtTheirBuffer) {
  // The metadata directory still fits; of the thumbnail's name seven bytes are left.
  const std::string media = PathOfLength(4080, "abcdefgh.jpg");
  WriteFile(media, "media");
  const size_t slash = media.rfind('/');
  const std::string eaDir = media.substr(0, slash) + "/@eaDir" + media.substr(slash);
  ASSERT_EQ(eaDir.size(), 4087U);
  MakeDirectories(eaDir);
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 1);
  WriteFile(eaDir + "/VELAPHO", "cut");
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
