// The thumbnail status of the photos of one directory.
#include <sys/stat.h>
#include <unistd.h>

#include "storage/deep_files.h"
#include "storage/photo_tree.h"
#include "support/named_case.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;

constexpr PhotoWork kNothing = {0, 0};

class DirectoryStatus : public TreeTest {};

TEST_F(DirectoryStatus, CountsPhotosThatLackThumbsAndTheThumbsTheyLack) {
  for (const char* name : {"complete.jpg", "bare.jpg", "half.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kTop, "complete.jpg", 63);
  MakeThumbs(kTop, "half.jpg", kBitS | kBitM | kBitB);
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{2, 9}));
}

TEST_F(DirectoryStatus, OutdatedThumbsAreLacking) {
  MakePhoto(In("a.jpg"));
  MakeThumbs(kTop, "a.jpg", 63 & ~kBitL);
  MakeThumbs(kTop, "a.jpg", kBitL, -1);
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{1, 1}));
}

TEST_F(DirectoryStatus, OnlyTheSizesThatTheSettingsAskForCount) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  MakeThumbs(kTop, "a.jpg", kBitM);
  WriteFile(kSettings, "photo_thumb_size_map=\"3\"\nvideo_thumb_size_map=\"60\"\n");
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{2, 3}));
  WriteFile(kSettings, "photo_thumb_size_map=\"2\"\n");
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{1, 1}));
  WriteFile(kSettings, "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(WorkInDirectory(kTop), kNothing);
}

struct NamesCase : NamedCase {
  std::vector<std::string> names;
  PhotoWork work;
};

class DirectoryNames : public DirectoryStatus, public ::testing::WithParamInterface<NamesCase> {};

TEST_P(DirectoryNames, AreSelected) {
  for (const std::string& name : GetParam().names) {
    MakePhoto(In(name));
  }
  EXPECT_EQ(WorkInDirectory(kTop), GetParam().work);
}

const NamesCase kNames[] = {
    {"None", {}, {0, 0}},
    {"OtherFiles", {"film.mp4", "note.txt", "jpg", "a.jpg.part", "a"}, {0, 0}},
    {"Photos", {"a.jpg", "B.NEF", "c.heic"}, {3, 18}},
    {"NamesThatAreNotIndexed", {".a.jpg", "@a.jpg", "#a.jpg", "..jpg"}, {0, 0}},
    {"SimilarNames", {"a.b.jpg", "a@.jpg", "a#.jpg"}, {3, 18}},
    {"Subdirectories", {"below/a.jpg", "called.jpg/a.jpg"}, {0, 0}},
};
INSTANTIATE_TEST_SUITE_P(Directory, DirectoryNames, ::testing::ValuesIn(kNames), CaseName());

TEST_F(DirectoryStatus, LinksToPhotosCountAsPhotos) {
  MakePhoto("/tmp/elsewhere/a.jpg");
  ASSERT_EQ(symlink("/tmp/elsewhere/a.jpg", In("link.jpg").c_str()), 0);
  ASSERT_EQ(symlink("/tmp/nowhere.jpg", In("dangling.jpg").c_str()), 0);
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{1, 6}));
}

TEST_F(DirectoryStatus, LinksToDirectoriesAreRead) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kTop, "/tmp/link"), 0);
  EXPECT_EQ(WorkInDirectory("/tmp/link"), (PhotoWork{1, 6}));
}

TEST_F(DirectoryStatus, AnythingButADirectoryIsSilentlyIgnored) {
  MakePhoto("/tmp/a.jpg");
  EXPECT_EQ(WorkInDirectory("/tmp/nowhere"), kNothing);
  EXPECT_EQ(WorkInDirectory("/tmp/a.jpg"), kNothing);
  EXPECT_EQ(WorkInDirectory(""), kNothing);
}

TEST_F(DirectoryStatus, ADirectoryThatCannotBeOpenedIsLogged) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod(kTop, 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(WorkInDirectory(kTop), kNothing);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_thumb_status:153 [Error] opendir: /tmp/tree"));
}

TEST_F(DirectoryStatus, PhotosThatCannotBeReachedDoNotCount) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod(kTop, 0444), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(WorkInDirectory(kTop), kNothing);
}

TEST_F(DirectoryStatus, OnePhotoWithoutMetadataDirectoryDoesNotStopTheOthers) {
  // Below a metadata directory no photo has one of its own.
  const std::string inside = std::string(kTop) + "/@eaDir/sub";
  MakePhoto(inside + "/a.jpg");
  EXPECT_EQ(WorkInDirectory(inside), kNothing);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + inside + "/a.jpg"));
}

TEST_F(DirectoryStatus, ChangesNothing) {
  for (const char* name : {"bare.jpg", "outdated.jpg", "empty.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kTop, "outdated.jpg", 63, -1);
  WriteFile(In("@eaDir/empty.jpg/VELAPHOTO_THUMB_M.jpg"), "");
  WriteFile(In("@eaDir/empty.jpg/VELAPHOTO_THUMB_S.fail"), "");
  WriteFile(In("@eaDir/gone.jpg/VELAPHOTO_THUMB_S.jpg"), "thumb");
  const std::vector<std::string> before = ListTree("/tmp");
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{3, 18}));
  EXPECT_EQ(ListTree("/tmp"), before);
}

TEST_F(DirectoryStatus, NamesOfTheLongestKindAndOfAnyBytesCount) {
  const std::string longest = std::string(251, 'n') + ".jpg";
  const std::string bytes = "\xff\xfe %s\n:\\\"\x01.jpg";
  for (const std::string& name : {longest, bytes}) {
    MakePhoto(In(name));
    MakeThumbs(kTop, name, kBitS | kBitXL);
  }
  EXPECT_EQ(WorkInDirectory(kTop), (PhotoWork{2, 8}));
}

struct LengthCase : NamedCase {
  size_t length;      ///< of the photo's path
  const char* thumb;  ///< name of the file in the metadata directory, if any
  PhotoWork work;
  bool isLogged = false;
};

class LongPhotoPath : public DirectoryStatus, public ::testing::WithParamInterface<LengthCase> {};

TEST_P(LongPhotoPath, IsHandled) {
  const std::string photo = PathOfLength(GetParam().length, "a.jpg");
  const std::string dir = DirectoryOf(photo);
  MakePhoto(photo);
  if (*GetParam().thumb != '\0') {
    WriteFile(dir + "/@eaDir/a.jpg/" + GetParam().thumb, "thumb");
  }
  EXPECT_EQ(WorkInDirectory(dir), GetParam().work);
  if (GetParam().isLogged) {
    EXPECT_THAT(TakeErrorLines(),
                ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + photo));
  }
}

constexpr size_t kLongestWithMetadata = 4095 - 7;  // "@eaDir/" is inserted
constexpr LengthCase kLengths[] = {
    {"ThumbFits", kLongestWithMetadata - 22, "VELAPHOTO_THUMB_S.jpg", {1, 5}},
    // The name of the thumbnail would be truncated by one byte.
    {"ThumbDoesNotFit", kLongestWithMetadata - 21, "VELAPHOTO_THUMB_S.jp", {1, 6}},
    {"MetadataDirectoryFits", kLongestWithMetadata, "", {1, 6}},
    {"MetadataDirectoryDoesNotFit", 4089, "", {0, 0}, true},
    {"LongestPath", 4095, "", {0, 0}, true},
};
INSTANTIATE_TEST_SUITE_P(Photo, LongPhotoPath, ::testing::ValuesIn(kLengths), CaseName());

TEST_F(DirectoryStatus, APathThatIsTooLongIsTruncated) {
  // Only "/a.jpg" of the name fits after the directory.
  const std::string dir = DirectoryOfLength(4089);
  const FileInDirectory tooLong(dir, "a.jpg.copy.jpg");
  EXPECT_EQ(WorkInDirectory(dir), kNothing);
  const FileInDirectory cut(dir, "a.jpg");
  EXPECT_EQ(WorkInDirectory(dir), kNothing);
  const std::string line = "velamk_thumb_status:89 [Error] get eadir: " + dir + "/a.jpg";
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line, line));
}

}  // namespace
}  // namespace vela_test
