// The step of the recursive walk, and the checks before a directory is processed.
#include "thumb/directory_walk.h"

#include <ftw.h>

#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

/// The action codes of the C library's walk.
constexpr int kContinue = 0;
constexpr int kSkipSubtree = 2;

constexpr const char* kProfileFile = "/tmp/profiles.conf";

/// Makes a link about which a line is logged when the directory is processed.
void PutTrace(const std::string& dir) {
  MakeDirectories(dir);
  ASSERT_EQ(symlink("nowhere", (dir + "/trace.jpg").c_str()), 0);
}

std::string TraceOf(const std::string& dir) {
  return "velathumb:416 [Error] stat: " + dir + "/trace.jpg";
}

class WalkStep : public PassTest {
 protected:
  static int Step(const std::string& path, int typeFlag) {
    FTW walk = {};
    walk.base = static_cast<int>(path.rfind('/') + 1);
    const struct stat status = {};
    return RecursiveDirCallback(path.c_str(), &status, typeFlag, &walk);
  }
};

TEST_F(WalkStep, ContinuesAfterADirectory) {
  EXPECT_EQ(Step(kDir, FTW_D), kContinue);
}

TEST_F(WalkStep, ContinuesAfterADirectoryThatIsGone) {
  EXPECT_EQ(Step("/tmp/missing", FTW_D), kContinue);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WalkStep, SkipsEverythingElse) {
  for (const int typeFlag : {FTW_F, FTW_DNR, FTW_NS, FTW_SL, FTW_SLN, FTW_DP}) {
    EXPECT_EQ(Step(kDir, typeFlag), kSkipSubtree) << typeFlag;
  }
}

TEST_F(WalkStep, RefusesByTheLastNameOfThePath) {
  for (const char* name : {"@eaDir", "@tmp", "#recycle", ".hidden", "lost+found"}) {
    EXPECT_EQ(Step(std::string(kDir) + "/" + name, FTW_D), kSkipSubtree) << name;
    EXPECT_EQ(Step(std::string("/tmp/") + name + "/photos", FTW_D), kContinue) << name;
  }
  EXPECT_EQ(Step(".hidden", FTW_D), kSkipSubtree);
}

TEST_F(WalkStep, ProcessesAcceptedDirectoriesOnly) {
  const std::string refused = std::string(kDir) + "/@tmp";
  PutTrace(refused);
  PutTrace(kDir);
  Step(refused, FTW_D);
  Step(kDir, FTW_F);
  Step(kDir, FTW_DNR);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

class DirectoryRun : public PassTest {
 protected:
  /// Runs it. Returns what it wrote to standard error.
  static std::string Run(const std::string& dir, const std::string& profiles = kProfileFile) {
    ::testing::internal::CaptureStderr();
    RunDirectoryJob(dir, profiles);
    return ::testing::internal::GetCapturedStderr();
  }
};

TEST_F(DirectoryRun, ProcessesTheDirectory) {
  PutTrace(kDir);
  EXPECT_EQ(Run(kDir), "");
  EXPECT_THAT(ErrorLines(), ElementsAre(TraceOf(kDir)));
}

TEST_F(DirectoryRun, ReportsAProfileFileThatCannotBeLoaded) {
  PutTrace(kDir);
  WriteFile(kProfileFile, "neither section nor key\n");
  EXPECT_EQ(Run(kDir), "Failed to parse /tmp/profiles.conf");
  MakeDirectories("/tmp/100%s");
  EXPECT_EQ(Run(kDir, "/tmp/100%s"), "Failed to parse /tmp/100%s");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryRun, SilentlySkipsMissingFiles) {
  EXPECT_EQ(Run("/tmp/missing"), "");
  EXPECT_EQ(Run(""), "");
  PutTrace(kDir);
  EXPECT_EQ(Run(kDir, "/tmp/missing.conf"), "");
  EXPECT_EQ(Run(kDir, ""), "");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryRun, ChecksThePermissionBeforeItReadsTheProfiles) {
  WriteFile(kProfileFile, "neither section nor key\n");
  const ReadOnlyMount mount(kDir);
  EXPECT_EQ(Run(kDir), "");
}

TEST_F(DirectoryRun, SkipsDirectoriesThatMayHaveNoMetadata) {
  PutTrace(kMetadata);
  EXPECT_EQ(Run(kMetadata), "");
  EXPECT_EQ(Run(kMetadataRoot), "");
  WriteFile("/tmp/file", "");
  EXPECT_EQ(Run("/tmp/file"), "");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

using TreeRun = PassTest;

TEST_F(TreeRun, GivesEachDirectoryTheProfileFileOfTheLatestRun) {
  PutTrace(kDir);
  PutTrace(std::string(kDir) + "/sub");
  WriteFile("/tmp/bad.conf", "neither section nor key\n");
  ::testing::internal::CaptureStderr();
  RunDirectoryTree(kDir, "/tmp/bad.conf");
  EXPECT_EQ(::testing::internal::GetCapturedStderr(),
            "Failed to parse /tmp/bad.confFailed to parse /tmp/bad.conf");
  EXPECT_THAT(ErrorLines(), IsEmpty());
  RunDirectoryTree(kDir, kProfileFile);
  EXPECT_THAT(ErrorLines(), ElementsAre(TraceOf(kDir), TraceOf(std::string(kDir) + "/sub")));
}

TEST_F(TreeRun, FailureOfTheWalkIsIgnored) {
  RunDirectoryTree("/tmp/missing", kProfileFile);
  RunDirectoryTree("", kProfileFile);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
