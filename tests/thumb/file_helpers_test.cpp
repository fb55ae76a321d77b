// Creating directories and removing files by pattern.
#include "storage/file_helpers.h"

#include "posix/glob_matches.h"
#include "thumb/thumb_test.h"

namespace vela_test {
namespace {

/// The log line about a directory that could not be created.
std::string MkdirLine(const std::string& path, int error) {
  return "velathumb:447 velathumb: checkCreateDir(447) - mkdir(" + path +
         ", 0777 ), errno: " + std::to_string(error) + "\n";
}

class CheckCreateDir : public SandboxTest {
 private:
  ZeroMask mask_;
};

TEST_F(CheckCreateDir, CreatesAMissingDirectoryWritableByAll) {
  EXPECT_EQ(checkCreateDir("/tmp/made"), 1);
  EXPECT_TRUE(IsDirectory("/tmp/made"));
  EXPECT_EQ(ModeOf("/tmp/made"), 0777);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, DoesNotChangeAnExistingDirectory) {
  WriteFile("/tmp/there/file", "x");
  ASSERT_EQ(chmod("/tmp/there", 0750), 0);
  EXPECT_EQ(checkCreateDir("/tmp/there"), 1);
  EXPECT_EQ(ModeOf("/tmp/there"), 0750);
  EXPECT_THAT(ListDirectory("/tmp/there"), ElementsAre("file"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, DoesNotTryToCreateAnExistingDirectory) {
  MakeDirectories("/tmp/there");
  const BeforeExec refuseMkdir = SeccompFail(MkdirCalls(), ENOSPC);
  EXPECT_EQ(ForkCall([&] { return refuseMkdir() == 0 ? checkCreateDir("/tmp/there") : 99; }), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  // The refusal is effective: creating a missing directory fails.
  EXPECT_EQ(ForkCall([&] { return refuseMkdir() == 0 ? checkCreateDir("/tmp/missing") : 99; }), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine("/tmp/missing", ENOSPC)));
}

TEST_F(CheckCreateDir, AnyFileOfThatNameCountsAsExisting) {
  MakeDirectories("/tmp/there");
  WriteFile("/tmp/file", "content");
  ASSERT_EQ(symlink("there", "/tmp/link"), 0);
  ASSERT_EQ(symlink("nowhere", "/tmp/dangling"), 0);
  for (const char* path : {"/tmp/file", "/tmp/link", "/tmp/dangling"}) {
    EXPECT_EQ(checkCreateDir(path), 1) << path;
  }
  EXPECT_EQ(ReadFile("/tmp/file"), "content");
  EXPECT_FALSE(Exists("/tmp/nowhere"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, MissingParentIsASilentFailure) {
  EXPECT_EQ(checkCreateDir("/tmp/missing/dir"), 0);
  EXPECT_FALSE(Exists("/tmp/missing"));
  EXPECT_EQ(checkCreateDir(""), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CheckCreateDir, LogsTheReasonOfAFailure) {
  WriteFile("/tmp/100%s%n", "");
  MakeDirectories("/tmp/volume");
  const ReadOnlyMount mount("/tmp/volume");
  MakeDirectories("/tmp/closed");
  ASSERT_EQ(chmod("/tmp/closed", 0555), 0);
  const WithoutCapabilities ordinary;
  struct {
    std::string path;
    int error;
  } const rows[] = {{"/tmp/100%s%n/dir", ENOTDIR},
                    {"/tmp/volume/dir", EROFS},
                    {"/tmp/closed/dir", EACCES},
                    {"/tmp/" + std::string(256, 'n'), ENAMETOOLONG}};
  for (const auto& row : rows) {
    ClearLog();
    EXPECT_EQ(checkCreateDir(row.path), 0);
    EXPECT_THAT(ErrorLines(), ElementsAre(MkdirLine(row.path, row.error)));
  }
}

class RemoveByPattern : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/d");
  }

  static void Touch(const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      WriteFile("/tmp/d/" + name, "x");
    }
  }
};

TEST_F(RemoveByPattern, RemovesOnlyMatches) {
  Touch({"a.fail", "b.fail", "c.jpg", "d.fail.jpg", ".hidden.fail"});
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), 0);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre(".hidden.fail", "c.jpg", "d.fail.jpg"));
}

TEST_F(RemoveByPattern, SucceedsWithoutAMatch) {
  Touch({"c.jpg"});
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), 0);
  EXPECT_EQ(RemoveFilesByPattern("/tmp/missing/*.fail"), 0);
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/plain"), 0);
  EXPECT_EQ(RemoveFilesByPattern(""), 0);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("c.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RemoveByPattern, RemovesTheOthersWhenOneCannotBeRemoved) {
  Touch({"a.fail"});
  MakeDirectories("/tmp/d/b.fail");
  Touch({"c.fail"});
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), -1);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("b.fail"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RemoveByPattern, FailsOnAReadOnlyVolume) {
  Touch({"a.fail"});
  const ReadOnlyMount mount("/tmp/d");
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), -1);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a.fail"));
}

TEST_F(RemoveByPattern, FindsNoMatchInAnUnreadableDirectory) {
  Touch({"a.fail"});
  ASSERT_EQ(chmod("/tmp/d", 0333), 0);
  {
    const WithoutCapabilities ordinary;
    EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), 0);
  }
  EXPECT_TRUE(Exists("/tmp/d/a.fail"));
}

TEST_F(RemoveByPattern, RemovesLinksNotTheirTargets) {
  Touch({"kept.jpg"});
  ASSERT_EQ(symlink("kept.jpg", "/tmp/d/a.fail"), 0);
  ASSERT_EQ(symlink("nowhere", "/tmp/d/b.fail"), 0);
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/*.fail"), 0);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("kept.jpg"));
}

TEST_F(RemoveByPattern, TakesShellPatterns) {
  Touch({"a1", "a2", "a3", "b1", "ab1"});
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/a[12]"), 0);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a3", "ab1", "b1"));
  EXPECT_EQ(RemoveFilesByPattern("/tmp/d/?1"), 0);
  EXPECT_THAT(ListDirectory("/tmp/d"), ElementsAre("a3", "ab1"));
}

/// Each name is a pattern that would match the other one, if it were taken as a pattern.
struct PatternName : NamedCase {
  const char* own;
  const char* neighbour;
};

class EscapedPattern : public SandboxTest, public ::testing::WithParamInterface<PatternName> {};

TEST_P(EscapedPattern, MatchesOnlyThePathItself) {
  const std::string own = std::string("/tmp/") + GetParam().own;
  const std::string neighbour = std::string("/tmp/") + GetParam().neighbour;
  WriteFile(own + "/x.fail", "");
  WriteFile(neighbour + "/x.fail", "");
  EXPECT_EQ(RemoveFilesByPattern(vela::EscapePattern(own) + "/*.fail"), 0);
  EXPECT_THAT(ListDirectory(own), IsEmpty());
  EXPECT_THAT(ListDirectory(neighbour), ElementsAre("x.fail"));
}

INSTANTIATE_TEST_SUITE_P(Names, EscapedPattern,
                         ::testing::Values(PatternName{"Set", "a[1].jpg", "a1.jpg"},
                                           PatternName{"Star", "*.jpg", "z.jpg"},
                                           PatternName{"QuestionMark", "b?.jpg", "bb.jpg"},
                                           PatternName{"Backslash", "c\\d.jpg", "cd.jpg"},
                                           PatternName{"NegatedSet", "[!a].jpg", "b.jpg"},
                                           PatternName{"OpeningBracket", "[", "]"},
                                           PatternName{"ClosingBracket", "]", "["},
                                           PatternName{"Braces", "{e,f}.jpg", "e.jpg"},
                                           PatternName{"Tilde", "~", "root"},
                                           PatternName{"Dot", "plain.jpg", "plainxjpg"},
                                           PatternName{"Bytes", "\xe4\xff.jpg", "\xe4.jpg"}),
                         CaseName());

}  // namespace
}  // namespace vela_test
