// Metadata directories and the derived files in them.
#include "platform/platform_fixture.h"
#include "support/mounts.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr const char* kName = "VELAPHOTO_THUMB_M.jpg";
constexpr const char* kOldName = "VELAPHOTO:THUMB_M.jpg";
constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kEaDir = "/tmp/photos/@eaDir/a.jpg";

std::string InEaDir(const char* name) {
  return std::string(kEaDir) + "/" + name;
}

class EaWriteSupport : public SandboxTest {};

TEST_F(EaWriteSupport, ExistsForWritableDirectoriesOutsideMetadata) {
  MakeDirectories("/tmp/photos/@eaDir/sub");
  MakeDirectories("/tmp/photos/my@eaDir/@eaDirs");
  ASSERT_EQ(symlink("photos", "/tmp/link"), 0);
  WriteFile("/tmp/file", "x");
  for (const char* path :
       {"/tmp/photos", "/tmp/photos/", "/tmp/link", "/tmp/photos/my@eaDir/@eaDirs"}) {
    EXPECT_EQ(IndexIsPathSupportEAWrite(path), 1) << path;
  }
  for (const char* path : {"/tmp/file", "/tmp/absent", "", "/tmp/photos/@eaDir",
                           "/tmp/photos/@eaDir/", "/tmp/photos/@eaDir/sub"}) {
    EXPECT_EQ(IndexIsPathSupportEAWrite(path), 0) << path;
  }
  EXPECT_EQ(IndexIsPathSupportEAWrite(nullptr), 0);
}

TEST_F(EaWriteSupport, DoesNotExistOnAReadOnlyVolume) {
  MakeDirectories("/tmp/photos");
  const ReadOnlyMount closed("/tmp/photos");
  EXPECT_EQ(IndexIsPathSupportEAWrite("/tmp/photos"), 0);
}

TEST_F(EaWriteSupport, NeedsWriteAndSearchPermission) {
  MakeDirectories("/tmp/photos");
  const WithoutCapabilities ordinary;
  for (const mode_t mode : {0500, 0600, 0100, 0200}) {
    ASSERT_EQ(chmod("/tmp/photos", mode), 0);
    EXPECT_EQ(IndexIsPathSupportEAWrite("/tmp/photos"), 0) << std::oct << mode;
  }
  ASSERT_EQ(chmod("/tmp/photos", 0300), 0);
  EXPECT_EQ(IndexIsPathSupportEAWrite("/tmp/photos"), 1);
}

std::string EaDirOf(const std::string& path, size_t outSize = 4096) {
  std::vector<char> out(outSize + 1, '!');
  const int result = VELAEADirPath(0, path.c_str(), out.data(), outSize);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return result == 0 ? out.data() : "failed";
}

TEST(EaDirPath, IsInTheMetadataDirectoryBesideTheFile) {
  const struct {
    const char* path;
    const char* result;
  } cases[] = {
      {"/photo/a.jpg", "/photo/@eaDir/a.jpg"},
      {"photo/a.jpg", "photo/@eaDir/a.jpg"},
      {"/a.jpg", "/@eaDir/a.jpg"},
      {"a.jpg", "@eaDir/a.jpg"},
      {"/p/\xff %\n", "/p/@eaDir/\xff %\n"},
      {"/p@eaDir/@eaDir2", "/p@eaDir/@eaDir/@eaDir2"},
      // without file name
      {"/photo/", "failed"},
      {"/", "failed"},
      // inside metadata
      {"/photo/@eaDir/a.jpg", "failed"},
      {"/photo/@eaDir/a.jpg/thumb.jpg", "failed"},
      {"@eaDir/a", "failed"},
      {"/photo/@eaDir", "failed"},
      {"@eaDir", "failed"},
  };
  for (const auto& [path, result] : cases) EXPECT_EQ(EaDirOf(path), result) << path;
}

TEST(EaDirPath, FailsWithoutAPathOrABuffer) {
  EXPECT_EQ(EaDirOf(""), "failed");
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  char out[8];
  EXPECT_EQ(VELAEADirPath(0, nullptr, out, sizeof(out)), -1);
  EXPECT_EQ(VELAEADirPath(0, "a", nullptr, 8), -1);
}

TEST(EaDirPath, FailsWhenTheResultDoesNotFit) {
  const std::string result = "/photo/@eaDir/a.jpg";
  EXPECT_EQ(EaDirOf("/photo/a.jpg", result.size() + 1), result);
  EXPECT_EQ(EaDirOf("/photo/a.jpg", result.size()), "failed");
  EXPECT_EQ(VLIBCErrGet(), ENAMETOOLONG);
  EXPECT_EQ(EaDirOf("/photo/a.jpg", 0), "failed");
  const std::string longest(4087, 'a');
  EXPECT_TRUE(EaDirOf("/" + longest) == "/@eaDir/" + longest);
  EXPECT_EQ(EaDirOf("/" + longest + "a"), "failed");
}

class DerivedFiles : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kPhoto, "photo");
    MakeDirectories(kEaDir);
  }

  static const char* Find(int64_t* size = nullptr) {
    return IsEAFileExist(kEaDir, size, kName, kOldName);
  }
  static int Remove(const char* eaDir = kEaDir) { return RemoveEAFile(eaDir, kName, kOldName); }
};

TEST_F(DerivedFiles, AreFoundUnderEitherName) {
  EXPECT_EQ(Find(), nullptr);
  EXPECT_EQ(IsEAFileExist2(kPhoto, kName, kOldName), 0);
  WriteFile(InEaDir(kOldName), "old");
  EXPECT_EQ(Find(), kOldName);
  EXPECT_GT(IsEAFileExist2(kPhoto, kName, kOldName), 0);
  WriteFile(InEaDir(kName), "new");
  EXPECT_EQ(Find(), kName);
  EXPECT_GT(IsEAFileExist2(kPhoto, kName, kOldName), 0);
}

TEST_F(DerivedFiles, HaveTheSizeOfTheOneFound) {
  int64_t size = -7;
  Find(&size);
  EXPECT_EQ(size, -7);
  WriteFile(InEaDir(kOldName), "1234567");
  Find(&size);
  EXPECT_EQ(size, 7);
  WriteFile(InEaDir(kName), "");
  EXPECT_EQ(Find(&size), kName);
  EXPECT_EQ(size, 0);
}

TEST_F(DerivedFiles, CanBeLargerThanFourGigabytes) {
  WriteFile(InEaDir(kName), "x");
  constexpr int64_t kSize = int64_t{5} << 30;
  ASSERT_EQ(truncate(InEaDir(kName).c_str(), kSize), 0);
  int64_t size = 0;
  EXPECT_EQ(Find(&size), kName);
  EXPECT_EQ(size, kSize);
}

TEST_F(DerivedFiles, AreRegularFilesWithLinksFollowed) {
  ASSERT_EQ(mkdir(InEaDir(kName).c_str(), 0777), 0);
  EXPECT_EQ(Find(), nullptr);
  ASSERT_EQ(symlink(kPhoto, InEaDir(kOldName).c_str()), 0);
  EXPECT_EQ(Find(), kOldName);
  ASSERT_EQ(unlink(kPhoto), 0);
  EXPECT_EQ(Find(), nullptr);
}

TEST_F(DerivedFiles, AreNotFoundUnderNoName) {
  EXPECT_EQ(IsEAFileExist(kEaDir, nullptr, nullptr, nullptr), nullptr);
  EXPECT_EQ(IsEAFileExist(nullptr, nullptr, kName, kOldName), nullptr);
  EXPECT_EQ(IsEAFileExist("", nullptr, kName, kOldName), nullptr);
  EXPECT_EQ(IsEAFileExist2(nullptr, kName, kOldName), 0);
  EXPECT_EQ(IsEAFileExist2("/tmp/photos/", kName, kOldName), 0);
  EXPECT_EQ(IsEAFileExist(kEaDir, nullptr, std::string(5000, 'n').c_str(), kOldName), nullptr);
}

TEST_F(DerivedFiles, HaveThePathOfTheOneFound) {
  char path[4096] = "";
  EXPECT_EQ(GetEAFilePath(kPhoto, kName, kOldName, path, sizeof(path)), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  WriteFile(InEaDir(kOldName), "x");
  EXPECT_EQ(GetEAFilePath(kPhoto, kName, kOldName, path, sizeof(path)), 0);
  EXPECT_EQ(path, InEaDir(kOldName));
  WriteFile(InEaDir(kName), "x");
  EXPECT_EQ(GetEAFilePath(kPhoto, kName, kOldName, path, sizeof(path)), 0);
  EXPECT_EQ(path, InEaDir(kName));
}

TEST_F(DerivedFiles, HaveNoPathThatDoesNotFit) {
  WriteFile(InEaDir(kName), "x");
  const std::string expected = InEaDir(kName);
  char path[4096] = "";
  EXPECT_EQ(GetEAFilePath(kPhoto, kName, kOldName, path, expected.size()), -1);
  EXPECT_EQ(GetEAFilePath(kPhoto, kName, kOldName, path, expected.size() + 1), 0);
  EXPECT_EQ(path, expected);
  EXPECT_EQ(GetEAFilePath("/tmp/photos/", kName, kOldName, path, sizeof(path)), -1);
}

TEST_F(DerivedFiles, AreRemovedUnderBothNames) {
  for (const bool byPhoto : {false, true}) {
    WriteFile(InEaDir(kName), "x");
    WriteFile(InEaDir(kOldName), "x");
    WriteFile(InEaDir("other"), "x");
    EXPECT_EQ(byPhoto ? RemoveEAFile2(kPhoto, kName, kOldName) : Remove(), 0);
    EXPECT_EQ(ListDirectory(kEaDir), std::vector<std::string>{"other"});
  }
}

TEST_F(DerivedFiles, MayBeMissingWhenRemoved) {
  EXPECT_EQ(Remove(), 0);
  WriteFile(InEaDir(kOldName), "x");
  EXPECT_EQ(Remove(), 0);
  EXPECT_FALSE(Exists(InEaDir(kOldName)));
  EXPECT_EQ(Remove("/tmp/absent"), 0);
  EXPECT_EQ(Remove(kPhoto), 0) << "a file in place of the directory";
  EXPECT_EQ(RemoveEAFile2("/tmp/photos/b.jpg", kName, kOldName), 0);
}

TEST_F(DerivedFiles, LeaveNothingOutWhenOneCannotBeRemoved) {
  ASSERT_EQ(mkdir(InEaDir(kName).c_str(), 0777), 0);
  WriteFile(InEaDir(kOldName), "x");
  EXPECT_EQ(Remove(), -1);
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
  EXPECT_FALSE(Exists(InEaDir(kOldName)));
}

TEST_F(DerivedFiles, FailToBeRemovedOnlyWhenThere) {
  const ReadOnlyMount closed(kEaDir);
  EXPECT_EQ(Remove(), 0);
}

TEST_F(DerivedFiles, FailToBeRemovedFromAReadOnlyVolume) {
  WriteFile(InEaDir(kOldName), "x");
  const ReadOnlyMount closed(kEaDir);
  EXPECT_EQ(Remove(), -1);
  EXPECT_EQ(VLIBCErrGet(), EROFS);
  EXPECT_TRUE(Exists(InEaDir(kOldName)));
}

TEST_F(DerivedFiles, ThatAreLinksAreRemovedButNotTheirTargets) {
  ASSERT_EQ(symlink(kPhoto, InEaDir(kName).c_str()), 0);
  EXPECT_EQ(Remove(), 0);
  EXPECT_FALSE(Exists(InEaDir(kName)));
  EXPECT_TRUE(Exists(kPhoto));
}

class Existence : public SandboxTest {};

TEST_F(Existence, OfFiles) {
  WriteFile("/tmp/file", "");
  MakeDirectories("/tmp/dir");
  ASSERT_EQ(mkfifo("/tmp/fifo", 0600), 0);
  ASSERT_EQ(symlink("file", "/tmp/link"), 0);
  ASSERT_EQ(symlink("absent", "/tmp/dangling"), 0);
  EXPECT_EQ(IsFileExist("/tmp/file"), 1);
  EXPECT_EQ(IsFileExist("/tmp/link"), 1);
  for (const char* other : {"/tmp/dir", "/tmp/fifo"}) {
    EXPECT_EQ(IsFileExist(other), 0) << other;
    EXPECT_EQ(IsFileExist(other, 0), 1) << other;
  }
  for (const char* none : {"/tmp/absent", "/tmp/dangling", "", "/tmp/file/below"}) {
    EXPECT_EQ(IsFileExist(none), 0) << none;
    EXPECT_EQ(IsFileExist(none, 0), 0) << none;
  }
  EXPECT_EQ(IsFileExist("/tmp/file", 0), 1);
  EXPECT_EQ(IsFileExist(nullptr), 0);
}

TEST_F(Existence, OfDirectories) {
  WriteFile("/tmp/file", "");
  MakeDirectories("/tmp/dir");
  ASSERT_EQ(symlink("dir", "/tmp/link"), 0);
  EXPECT_EQ(IsDirExist("/tmp/dir"), 1);
  EXPECT_EQ(IsDirExist("/tmp/dir/"), 1);
  EXPECT_EQ(IsDirExist("/tmp/link"), 1);
  EXPECT_EQ(IsDirExist("/tmp/file"), 0);
  EXPECT_EQ(IsDirExist("/tmp/absent"), 0);
  EXPECT_EQ(IsDirExist(nullptr), 0);
}

}  // namespace
}  // namespace vela_test
