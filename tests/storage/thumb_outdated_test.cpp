// Whether a derived file has to be made again.
#include <unistd.h>

#include "storage/media_fixture.h"
#include "storage/velamk_util.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::MatchesRegex;

constexpr const char* kName = "VELAPHOTO_THUMB_M.jpg";

class ThumbOutdated : public MediaTest {
 protected:
  ThumbOutdated() : MediaTest("a.jpg") {}

  int Outdated(const std::string& name = kName) const {
    return IsEAThumbOutdated(Media().c_str(), name.c_str());
  }
};

struct ThumbCase : NamedCase {
  off_t bytes;
  int64_t seconds;  ///< its age relative to the photo
  int isOutdated;
};

class DatedThumbs : public ThumbOutdated, public ::testing::WithParamInterface<ThumbCase> {};

TEST_P(DatedThumbs, AreJudged) {
  MakeDerived(kName);
  ASSERT_EQ(truncate(Derived(kName).c_str(), GetParam().bytes), 0);  // sparse when large
  SetFileTime(Derived(kName), kMediaTime + GetParam().seconds);
  EXPECT_EQ(Outdated(), GetParam().isOutdated);
}

constexpr ThumbCase kCases[] = {
    {"Older", 10, -1, 1},
    {"OfTheSameAge", 10, 0, 0},
    {"Younger", 10, 1, 0},
    {"Empty", 0, 1, 1},
    {"OfOneByte", 1, 0, 0},
    {"OfTwoGiB", off_t{1} << 31, 1, 0},
    {"OfThreeGiB", off_t{3} << 30, 1, 0},
    {"OfFourGiB", off_t{1} << 32, 1, 0},
};
INSTANTIATE_TEST_SUITE_P(Thumb, DatedThumbs, ::testing::ValuesIn(kCases), CaseName());

TEST_F(ThumbOutdated, AMissingThumbIs) {
  EXPECT_EQ(Outdated(), 1);
  RemoveTree(EaDir());
  EXPECT_EQ(Outdated(), 1);
}

TEST_F(ThumbOutdated, OnlyWholeSecondsCount) {
  MakeDerived(kName);
  SetFileTime(Media(), kMediaTime, 999999999);
  SetFileTime(Derived(kName), kMediaTime, 0);
  EXPECT_EQ(Outdated(), 0);
}

TEST_F(ThumbOutdated, AnyDerivedFileCanBeChecked) {
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

TEST_F(ThumbOutdated, AThumbOfAMissingPhotoIsNot) {
  MakeDerived(kName, 0, -1);
  RemoveTree(Media());
  EXPECT_EQ(Outdated(), 0);
  RemoveTree(EaDir());
  EXPECT_EQ(Outdated(), 0);
  const char* line = "velamk_util:64 Fail to get /tmp/media/a.jpg file information";
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line, line));
}

TEST_F(ThumbOutdated, AFileWithoutMetadataDirectoryIsNot) {
  MakeDirectories("/tmp/media/folder");
  const std::string inside = MakeDerived("inside.jpg");
  const std::string tooLong = PathOfLength(4089, "long.jpg");
  WriteFile(tooLong, "media");
  for (const std::string& path : {std::string("/tmp/media/folder/"), inside, tooLong}) {
    SCOPED_TRACE(path);
    EXPECT_EQ(IsEAThumbOutdated(path.c_str(), kName), 0);
    EXPECT_NE(VLIBCErrGet(), 0);
    const std::string expected = NoDirectoryLine(69, path);
    EXPECT_THAT(expected, MatchesRegex("velamk_util:69 VELAEADirPath error "
                                       "\\[0x[0-9A-F]{4} [^ :]+:[1-9][0-9]*\\] on /tmp/.*"));
    EXPECT_THAT(TakeErrorLines(), ElementsAre(expected));
  }
}

TEST_F(ThumbOutdated, TheLongestMetadataDirectoryFits) {
  const std::string media = PathOfLength(4088, "long.jpg");
  WriteFile(media, "media");
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 1);
}

TEST_F(ThumbOutdated, PathsOfDerivedFilesAreTruncated) {
  // The metadata directory fits, but the thumbnail's name is truncated to seven bytes.
  const std::string media = PathOfLength(4080, "abcdefgh.jpg");
  WriteFile(media, "media");
  const std::string eaDir = DirectoryOf(media) + "/@eaDir/abcdefgh.jpg";
  ASSERT_EQ(eaDir.size(), 4087U);
  MakeDirectories(eaDir);
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 1);
  WriteFile(eaDir + "/VELAPHO", "cut");
  EXPECT_EQ(IsEAThumbOutdated(media.c_str(), kName), 0);
}

}  // namespace
}  // namespace vela_test
