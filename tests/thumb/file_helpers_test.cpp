// Making directories and removing files by pattern.
#include "storage/file_helpers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "posix/glob_matches.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"
#include "support/system_log.h"
#include "thumb/fork_call.h"
#include "thumb/zero_mask.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// The line of a directory that could not be made.
std::string MkdirLine(const std::string& path, int error) {
  return "velathumb:447 velathumb: checkCreateDir(447) - mkdir(" + path +
         ", 0777 ), errno: " + std::to_string(error) + "\n";
}

class CheckCreateDir : public SandboxTest {
 private:
  ZeroMask mask_;
};

TEST_F(CheckCreateDir, MakesMissingDirectoryForEverybody) {
  EXPECT_EQ(1, checkCreateDir("/tmp/made"));
  EXPECT_TRUE(IsDirectory("/tmp/made"));
  EXPECT_EQ(0777, ModeOf("/tmp/made"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, LeavesAnExistingDirectoryAsItIs) {
  WriteFile("/tmp/there/file", "x");
  ASSERT_EQ(0, chmod("/tmp/there", 0750));
  EXPECT_EQ(1, checkCreateDir("/tmp/there"));
  EXPECT_EQ(0750, ModeOf("/tmp/there"));
  EXPECT_THAT(ListDirectory("/tmp/there"), ElementsAre("file"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, DoesNotEvenTryToMakeWhatIsThere) {
  MakeDirectories("/tmp/there");
  const BeforeExec refuseMkdir = SeccompFail(MkdirCalls(), ENOSPC);
  EXPECT_EQ(1, ForkCall([&] { return refuseMkdir() == 0 ? checkCreateDir("/tmp/there") : 99; }));
  EXPECT_THAT(ErrorLines(), IsEmpty());
  // The refusal does hold: what is missing shows it.
  EXPECT_EQ(0, ForkCall([&] { return refuseMkdir() == 0 ? checkCreateDir("/tmp/missing") : 99; }));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/missing", ENOSPC)));
}

TEST_F(CheckCreateDir, FollowsLinkToDirectory) {
  MakeDirectories("/tmp/there");
  ASSERT_EQ(0, symlink("there", "/tmp/link"));
  EXPECT_EQ(1, checkCreateDir("/tmp/link"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, AFileOfThatNameCountsAsThere) {
  WriteFile("/tmp/file", "content");
  EXPECT_EQ(1, checkCreateDir("/tmp/file"));
  EXPECT_EQ("content", ReadFile("/tmp/file"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, ALinkToNowhereCountsAsThere) {
  ASSERT_EQ(0, symlink("nowhere", "/tmp/link"));
  EXPECT_EQ(1, checkCreateDir("/tmp/link"));
  EXPECT_FALSE(Exists("/tmp/nowhere"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, MissingParentIsASilentFailure) {
  EXPECT_EQ(0, checkCreateDir("/tmp/missing/dir"));
  EXPECT_FALSE(Exists("/tmp/missing"));
  EXPECT_EQ(0, checkCreateDir(""));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, LogsAParentThatIsAFile) {
  WriteFile("/tmp/file", "");
  EXPECT_EQ(0, checkCreateDir("/tmp/file/dir"));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/file/dir", ENOTDIR)));
}

TEST_F(CheckCreateDir, LogsAReadOnlyVolume) {
  MakeDirectories("/tmp/volume");
  const ReadOnlyMount mount("/tmp/volume");
  EXPECT_EQ(0, checkCreateDir("/tmp/volume/dir"));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/volume/dir", EROFS)));
}

TEST_F(CheckCreateDir, LogsAMissingPermission) {
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(0, chmod("/tmp/closed", 0555));
  const WithoutCapabilities ordinary;
  EXPECT_EQ(0, checkCreateDir("/tmp/closed/dir"));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/closed/dir", EACCES)));
}

TEST_F(CheckCreateDir, LogsANameThatIsTooLong) {
  const std::string path = "/tmp/" + std::string(256, 'n');
  EXPECT_EQ(0, checkCreateDir(path));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(path, ENAMETOOLONG)));
}

TEST_F(CheckCreateDir, LogsThePathAsItIs) {
  WriteFile("/tmp/100%s%n", "");
  EXPECT_EQ(0, checkCreateDir("/tmp/100%s%n/dir"));
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/100%s%n/dir", ENOTDIR)));
}

class RemoveByPattern : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/d");
  }

  static void Touch(const std::string& name) { WriteFile("/tmp/d/" + name, "x"); }
};

TEST_F(RemoveByPattern, RemovesWhatMatchesAndNothingElse) {
  for (const char* name : {"a.fail", "b.fail", "c.jpg", "d.fail.jpg", ".hidden.fail"}) {
    Touch(name);
  }
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/*.fail"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre(".hidden.fail", "c.jpg", "d.fail.jpg"));
}

TEST_F(RemoveByPattern, NothingToRemoveIsNoFailure) {
  Touch("c.jpg");
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/*.fail"));
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/missing/*.fail"));
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/plain"));
  EXPECT_EQ(0, RemoveFilesByPattern(""));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("c.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RemoveByPattern, OneThatStaysKeepsNoOtherFromBeingRemoved) {
  Touch("a.fail");
  MakeDirectories("/tmp/d/b.fail");
  Touch("c.fail");
  EXPECT_EQ(-1, RemoveFilesByPattern("/tmp/d/*.fail"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("b.fail"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RemoveByPattern, TellsAReadOnlyVolume) {
  Touch("a.fail");
  const ReadOnlyMount mount("/tmp/d");
  EXPECT_EQ(-1, RemoveFilesByPattern("/tmp/d/*.fail"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a.fail"));
}

TEST_F(RemoveByPattern, ADirectoryThatCannotBeReadHoldsNoMatch) {
  Touch("a.fail");
  ASSERT_EQ(0, chmod("/tmp/d", 0333));
  {
    const WithoutCapabilities ordinary;
    EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/*.fail"));
  }
  EXPECT_TRUE(Exists("/tmp/d/a.fail"));
}

TEST_F(RemoveByPattern, RemovesLinksNotWhatTheyLeadTo) {
  Touch("kept.jpg");
  ASSERT_EQ(0, symlink("kept.jpg", "/tmp/d/a.fail"));
  ASSERT_EQ(0, symlink("nowhere", "/tmp/d/b.fail"));
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/*.fail"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("kept.jpg"));
}

TEST_F(RemoveByPattern, TakesShellPatterns) {
  for (const char* name : {"a1", "a2", "a3", "b1", "ab1"}) {
    Touch(name);
  }
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/a[12]"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a3", "ab1", "b1"));
  EXPECT_EQ(0, RemoveFilesByPattern("/tmp/d/?1"));
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a3", "ab1"));
}

/// Each name is a pattern that would match the other one, if it were taken as a pattern.
struct PatternName {
  const char* name;
  const char* neighbour;
};

class EscapedPattern : public SandboxTest, public ::testing::WithParamInterface<PatternName> {};

TEST_P(EscapedPattern, MatchesOnlyThePathItself) {
  const std::string own = std::string("/tmp/") + GetParam().name;
  const std::string neighbour = std::string("/tmp/") + GetParam().neighbour;
  WriteFile(own + "/x.fail", "");
  WriteFile(neighbour + "/x.fail", "");
  EXPECT_EQ(0, RemoveFilesByPattern(vela::EscapePattern(own) + "/*.fail"));
  EXPECT_THAT(ListDirectory(own), IsEmpty());
  EXPECT_THAT(ListDirectory(neighbour), ElementsAre("x.fail"));
}

INSTANTIATE_TEST_SUITE_P(
    Names, EscapedPattern,
    ::testing::Values(PatternName{"a[1].jpg", "a1.jpg"}, PatternName{"*.jpg", "z.jpg"},
                      PatternName{"b?.jpg", "bb.jpg"}, PatternName{"c\\d.jpg", "cd.jpg"},
                      PatternName{"[!a].jpg", "b.jpg"}, PatternName{"[", "]"},
                      PatternName{"]", "["}, PatternName{"{e,f}.jpg", "e.jpg"},
                      PatternName{"~", "root"}, PatternName{"plain.jpg", "plainxjpg"},
                      PatternName{"\xe4\xff.jpg", "\xe4.jpg"}));

}  // namespace
}  // namespace vela_test
