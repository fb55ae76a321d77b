// File helpers and profile files.
#include "support/files.h"

#include <gmock/gmock.h>
#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include "support/profile_file.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class FilesTest : public SandboxTest {};

TEST_F(FilesTest, ContentIsByteExact) {
  const std::string content("a\0b\n\xff", 5);
  WriteFile("/tmp/d/e/f", content);
  EXPECT_EQ(ReadFile("/tmp/d/e/f"), content);
  AppendToFile("/tmp/d/e/f", "more");
  EXPECT_EQ(ReadFile("/tmp/d/e/f"), content + "more");
  CopyFile("/tmp/d/e/f", "/tmp/copy");
  EXPECT_EQ(ReadFile("/tmp/copy"), content + "more");
  WriteFileOfSize("/tmp/sized", 12345);
  EXPECT_EQ(FileSize("/tmp/sized"), 12345);
}

TEST_F(FilesTest, FailuresFailTheTest) {
  EXPECT_NONFATAL_FAILURE(ReadFile("/tmp/missing"), "cannot open /tmp/missing");
  EXPECT_NONFATAL_FAILURE(WriteFile("/proc/file", "x"), "cannot write /proc/file");
}

TEST_F(FilesTest, LinesAreWithoutTheirNewlines) {
  WriteFile("/tmp/f", "a\n\nb");
  EXPECT_THAT(ReadLines("/tmp/f"), ElementsAre("a", "", "b"));
  WriteFile("/tmp/f", "");
  EXPECT_THAT(ReadLines("/tmp/f"), IsEmpty());
}

TEST_F(FilesTest, TimesAreExact) {
  WriteFile("/tmp/f", "x");
  SetFileTime("/tmp/f", 1500000000, 123456789);
  EXPECT_EQ(ModificationTime("/tmp/f"), (FileTime{1500000000, 123456789}));
  EXPECT_EQ(AccessTime("/tmp/f"), (FileTime{1500000000, 123456789}));
  const time_t now = time(nullptr);
  SetFileTimeFromNow("/tmp/f", 3600);
  EXPECT_GE(ModificationTime("/tmp/f").seconds, now + 3600);
  EXPECT_LE(ModificationTime("/tmp/f").seconds, time(nullptr) + 3600);
}

TEST_F(FilesTest, TreesAreListedAndRemoved) {
  WriteFile("/tmp/d/b/c", "x");
  WriteFile("/tmp/d/a", "x");
  ASSERT_EQ(symlink("/usr", "/tmp/d/link"), 0);
  EXPECT_THAT(ListTree("/tmp/d"), ElementsAre("a", "b/", "b/c", "link"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a", "b", "link"));
  RemoveTree("/tmp/d");
  EXPECT_FALSE(Exists("/tmp/d"));
  RemoveTree("/tmp/d");
  EXPECT_THAT(ListTree("/tmp/d"), IsEmpty());
}

TEST_F(FilesTest, KindsAndModesAreKnown) {
  const mode_t mask = umask(077);
  MakeDirectories("/tmp/d/e");
  umask(mask);
  EXPECT_EQ(ModeOf("/tmp/d"), 0777);
  EXPECT_EQ(ModeOf("/tmp/d/e"), 0777);
  WriteFile("/tmp/f", "x");
  ASSERT_EQ(chmod("/tmp/f", 04640), 0);
  EXPECT_EQ(ModeOf("/tmp/f"), 04640);
  EXPECT_EQ(ModeOf("/tmp/missing"), -1);
  EXPECT_EQ(FileSize("/tmp/missing"), -1);
  ASSERT_EQ(symlink("nowhere", "/tmp/dangling"), 0);
  EXPECT_TRUE(Exists("/tmp/dangling"));
  EXPECT_FALSE(IsRegularFile("/tmp/dangling"));
  EXPECT_TRUE(IsRegularFile("/tmp/f"));
  EXPECT_FALSE(IsDirectory("/tmp/f"));
}

TEST_F(FilesTest, WaitingEndsInTime) {
  EXPECT_FALSE(WaitUntilExists("/tmp/missing", 10));
  EXPECT_TRUE(WaitUntilGone("/tmp/missing", 10));
  EXPECT_FALSE(WaitUntilGone("/tmp", 10));
}

TEST_F(FilesTest, ProfileFileHoldsWhatIsSet) {
  WriteProfileFile("/tmp/profile", {{"thumb", 120, 80, "0.5x0.5", "VELAPHOTO_THUMB_S.jpg", 2},
                                    {"other", std::nullopt, std::nullopt, std::nullopt,
                                     "VELAPHOTO:THUMB_M.jpg", std::nullopt}});
  EXPECT_EQ(
      ReadFile("/tmp/profile"),
      "[thumb]\nsize=120\nquality=80\nunsharp=0.5x0.5\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=2\n"
      "[other]\nfilename=VELAPHOTO:THUMB_M.jpg\n");
}

}  // namespace
}  // namespace vela_test
