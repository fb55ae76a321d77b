// Turning a JPEG in place, without decoding it.

#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <array>
#include <cstdint>

#include "converter_fixture.h"
#include "support/missing_library.h"
#include "support/mounts.h"
#include "support/stub_files.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using namespace ::testing;

struct stat StatusOf(const std::string& path) {
  struct stat status {};
  EXPECT_EQ(stat(path.c_str(), &status), 0);
  return status;
}

/// Gives a file, or with "default" a directory for its new files, an access control list by which
/// user 0 may read. Every file system in the tests supports such attributes.
void SetAccessList(const std::string& path, const std::string& kind) {
  struct Entry {
    uint16_t tag;
    uint16_t permissions;
    uint32_t id;
  };
  struct List {
    uint32_t version;
    std::array<Entry, 5> entries;
  };
  constexpr uint32_t kNobody = 0xFFFFFFFF;
  const List list = {2,
                     {{{0x01, 6, kNobody},
                       {0x02, 4, 0},
                       {0x04, 4, kNobody},
                       {0x10, 4, kNobody},
                       {0x20, 4, kNobody}}}};
  const std::string name = "system.posix_acl_" + kind;
  ASSERT_EQ(setxattr(path.c_str(), name.c_str(), &list, sizeof list, 0), 0);
}

class TurnInPlace : public ConverterTest {
 protected:
  const std::string photo_ = directory_ + "/photo.jpg";

  /// Turns photo_ by 90 degrees; the picture in `path`, the photo or its link target, is turned.
  void ExpectTurned(const std::string& path) const {
    ExpectSuccess(Turn("90", photo_));
    EXPECT_EQ(QuadrantLetters(path), LettersAfterTurn(90));
  }

  static ProgramResult Turn(const std::string& degrees, const std::string& path) {
    return RunConverter({"-rotate", degrees, path, path});
  }

  /// Makes every turn fail that the converter does not perform itself.
  static void RemoveImageMagick() { RemoveTool(kImageMagick); }
};

TEST_F(TurnInPlace, IsDoneByTheConverter) {
  RemoveImageMagick();
  for (const int degrees : {90, 180, 270}) {
    MakeJpeg(photo_);
    const ProgramResult result = Turn(std::to_string(degrees), photo_);
    EXPECT_EQ(result.exitCode, 0) << result.err;
    EXPECT_EQ(QuadrantLetters(photo_), LettersAfterTurn(degrees));
  }
  EXPECT_THAT(ListDirectory(directory_), ElementsAre("photo.jpg"));
}

TEST_F(TurnInPlace, LosesNothing) {
  MakePhoto("photo.jpg", 320, 240);
  RemoveImageMagick();
  const std::string original = directory_ + "/original.jpg";
  CopyFile(photo_, original);
  for (int turn = 0; turn < 4; ++turn) {
    ASSERT_EQ(Turn("90", photo_).exitCode, 0);
  }
  constexpr double kSamePixels = 1000;
  EXPECT_EQ(Compare(photo_, original).decibels, kSamePixels);
}

TEST_F(TurnInPlace, KeepsMetadata) {
  RemoveImageMagick();
  JpegRecipe recipe;
  recipe.orientation = 6;
  recipe.xmp = true;
  recipe.iccProfile = true;
  recipe.comment = "as it was";
  MakeJpeg(photo_, recipe);
  const std::string before = ReadFile(photo_);
  ASSERT_EQ(Turn("90", photo_).exitCode, 0);
  const std::string after = ReadFile(photo_);
  // Everything in front of the picture's own tables.
  const size_t tables = before.find("\xFF\xDB");
  ASSERT_NE(tables, std::string::npos);
  EXPECT_EQ(after.substr(0, tables), before.substr(0, tables));
}

TEST_F(TurnInPlace, KeepsThePermissions) {
  MakeJpeg(photo_);
  ASSERT_EQ(chmod(photo_.c_str(), 0640), 0);
  ASSERT_EQ(Turn("90", photo_).exitCode, 0);
  EXPECT_EQ(ModeOf(photo_), 0640);
}

TEST_F(TurnInPlace, KeepsPermissionsThatTheUmaskWouldRemove) {
  RemoveImageMagick();
  MakeJpeg(photo_);
  ASSERT_EQ(chmod(photo_.c_str(), 0666), 0);
  ProgramOptions options;
  options.umask = 077;
  ExpectSuccess(RunConverter({"-rotate", "90", photo_, photo_}, options));
  EXPECT_EQ(ModeOf(photo_), 0666);
}

TEST_F(TurnInPlace, LeavesLinksToImageMagick) {
  const std::string elsewhere = directory_ + "/elsewhere.jpg";
  MakeJpeg(elsewhere);
  ASSERT_EQ(symlink(elsewhere.c_str(), photo_.c_str()), 0);
  const ino_t inode = StatusOf(elsewhere).st_ino;
  ExpectSuccess(Turn("90", photo_));
  struct stat status {};
  ASSERT_EQ(lstat(photo_.c_str(), &status), 0);
  EXPECT_TRUE(S_ISLNK(status.st_mode));
  EXPECT_EQ(StatusOf(elsewhere).st_ino, inode);
  EXPECT_EQ(QuadrantLetters(elsewhere), LettersAfterTurn(90));
}

TEST_F(TurnInPlace, LeavesFilesOfSeveralNamesToImageMagick) {
  const std::string other = directory_ + "/other.jpg";
  MakeJpeg(photo_);
  ASSERT_EQ(link(photo_.c_str(), other.c_str()), 0);
  ExpectTurned(other);
  EXPECT_EQ(StatusOf(photo_).st_ino, StatusOf(other).st_ino);
}

TEST_F(TurnInPlace, LeavesFilesWithAccessListsToImageMagick) {
  MakeJpeg(photo_);
  SetAccessList(photo_, "access");
  ExpectTurned(photo_);
  EXPECT_GT(getxattr(photo_.c_str(), "system.posix_acl_access", nullptr, 0), 0);
}

TEST_F(TurnInPlace, LeavesFilesInDirectoriesWithDefaultAccessListsToImageMagick) {
  MakeJpeg(photo_);
  SetAccessList(directory_, "default");
  ExpectTurned(photo_);
  EXPECT_LE(getxattr(photo_.c_str(), "system.posix_acl_access", nullptr, 0), 0);
  EXPECT_THAT(ListDirectory(directory_), ElementsAre("photo.jpg"));
}

TEST_F(TurnInPlace, LeavesFilesOfOtherUsersToImageMagick) {
  MakeJpeg(photo_);
  // An ordinary user's sandbox has no other users.
  const bool isOthers = chown(photo_.c_str(), 1, 1) == 0;
  const ino_t inode = StatusOf(photo_).st_ino;
  ExpectTurned(photo_);
  EXPECT_EQ(StatusOf(photo_).st_ino == inode, isOthers);
  EXPECT_EQ(StatusOf(photo_).st_uid, isOthers ? 1U : geteuid());
  EXPECT_EQ(StatusOf(photo_).st_gid, isOthers ? 1U : getegid());
}

TEST_F(TurnInPlace, AcceptsAnyName) {
  RemoveImageMagick();
  for (const char* name : {"a b.jpg", "%d.jpg", "100%.jpg", "odd[1]*.jpg", "new\nline.jpg",
                           "\xFF.jpg", "png:x.jpg", "-x.jpg", "picture"}) {
    const std::string path = directory_ + "/" + name;
    MakeJpeg(path);
    EXPECT_EQ(Turn("90", path).exitCode, 0) << name;
    EXPECT_EQ(QuadrantLetters(path), LettersAfterTurn(90)) << name;
  }
}

TEST_F(TurnInPlace, LeavesPicturesThatEndWithinABlockToImageMagick) {
  JpegRecipe recipe;
  recipe.width = 70;
  recipe.height = 50;
  MakeJpeg(photo_, recipe);
  ExpectTurned(photo_);
  EXPECT_EQ(DecodeJpeg(photo_)->Width(), 50);
  EXPECT_EQ(DecodeJpeg(photo_)->Height(), 70);
}

TEST_F(TurnInPlace, LeavesOtherRequestsToImageMagick) {
  MakeDirectories("/usr/vela/lib");
  const StubTool imageMagick("/usr/vela/lib/convert-thumb");
  MakeJpeg(photo_);
  const std::string png = MakeImage(directory_ + "/a.png");
  // The stub has to be able to write its records.
  ProgramOptions options;
  options.addedEnvironment = {std::string("TMPDIR=") + kStubDirectory};
  const std::vector<std::vector<std::string>> requests = {{"-rotate", "0", photo_, photo_},
                                                          {"-rotate", "45", photo_, photo_},
                                                          {"-rotate", "90", png, png},
                                                          {"-rotate", "90", photo_, png}};
  for (const std::vector<std::string>& request : requests) {
    RunConverter(request, options);
  }
  EXPECT_THAT(imageMagick.Calls(), SizeIs(4));
}

TEST_F(TurnInPlace, LeavesDamagedFilesToImageMagick) {
  RemoveImageMagick();
  MakeTruncatedJpeg(photo_);
  const std::string before = ReadFile(photo_);
  EXPECT_EQ(Turn("90", photo_).exitCode, 1);
  EXPECT_EQ(ReadFile(photo_), before);
}

TEST_F(TurnInPlace, IsDoneByImageMagickWithoutTheLibrary) {
  const MissingLibrary missing("libturbojpeg");
  MakeJpeg(photo_);
  ExpectTurned(photo_);
}

TEST_F(TurnInPlace, LeavesLargePicturesToImageMagick) {
  SetMemoryLimit("1000000");
  MakePhoto("photo.jpg", 640, 480);
  RemoveImageMagick();
  EXPECT_EQ(Turn("90", photo_).exitCode, 1);
}

TEST_F(TurnInPlace, OnAFullVolumeNothingIsLost) {
  SmallVolume volume(directory_, 1 << 20);
  MakePhoto("photo.jpg", 640, 480);
  const std::string before = ReadFile(photo_);
  WriteFile(directory_ + "/filler", "");
  volume.SetAvailable(0);
  const ProgramResult result = Turn("90", photo_);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, StartsWith("convert-thumb: cannot replace " + photo_ + ": "));
  EXPECT_EQ(ReadFile(photo_), before);
  EXPECT_THAT(ListDirectory(directory_), Not(Contains(StartsWith("VELA"))));
}

TEST_F(TurnInPlace, IgnoresTheFileOfAKilledRun) {
  MakeJpeg(photo_);
  Program program = StartProgram(
      "/bin/sh", {"-c", "touch \"$1/VELAPHOTO.tmp.$$\"; exec \"$0\" -rotate 90 \"$2\" \"$2\"",
                  ConvertThumbPath(), directory_, photo_});
  EXPECT_EQ(program.Wait()->exitCode, 0);
  EXPECT_THAT(ListDirectory(directory_), ElementsAre("photo.jpg"));
}

}  // namespace
}  // namespace vela_test
