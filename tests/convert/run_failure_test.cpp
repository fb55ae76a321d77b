// Photos that cannot be converted and converters that fail.
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <vector>

#include "convert/convert_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

class RunFailure : public ConvertTest {
 protected:
  /// Runs a job of these widths with the converter doing as planned; the run has to fail.
  void ExpectFailure(const StubPlan& plan, const std::vector<int>& widths = {1280, 320, 120}) {
    Converter().Plan(plan);
    PhotoConvertJob job = MakeJob(widths);
    EXPECT_EQ(RunPhotoConvertJob(job), -1);
  }

  /// A source that is refused before anything runs.
  void ExpectRefused(const std::string& line) {
    ClearLog();
    PhotoConvertJob job = MakeJob({1280, 320});
    WriteFile(TempPath(320), "somebody else's");
    EXPECT_EQ(RunPhotoConvertJob(job), -1);
    EXPECT_THAT(ErrorLines(), ElementsAre(line));
    EXPECT_THAT(Converter().Calls(), IsEmpty());
    EXPECT_THAT(OutFiles(), ElementsAre("temp_320.jpg"));
  }
};

TEST_F(RunFailure, AMissingPhoto) {
  RemoveTree(kPhoto);
  ExpectRefused("velamk_photo_thumb:117 [Error] failed to stat file: /tmp/photo/a.jpg");
}

TEST_F(RunFailure, ADanglingLink) {
  RemoveTree(kPhoto);
  ASSERT_EQ(symlink("/tmp/photo/nowhere", kPhoto), 0);
  ExpectRefused("velamk_photo_thumb:117 [Error] failed to stat file: /tmp/photo/a.jpg");
}

TEST_F(RunFailure, AnEmptySourcePath) {
  PhotoConvertJob job = MakeJob({320});
  job.settings[0].srcPath = "";
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:117 [Error] failed to stat file: "));
}

TEST_F(RunFailure, ADirectory) {
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  ExpectRefused("velamk_photo_thumb:121 [Error] not a regular file: /tmp/photo/a.jpg");
}

TEST_F(RunFailure, APipe) {
  RemoveTree(kPhoto);
  ASSERT_EQ(mkfifo(kPhoto, 0666), 0);
  ExpectRefused("velamk_photo_thumb:121 [Error] not a regular file: /tmp/photo/a.jpg");
}

TEST_F(RunFailure, ALinkToAPhotoIsAPhoto) {
  ASSERT_EQ(rename(kPhoto, "/tmp/photo/real.jpg"), 0);
  ASSERT_EQ(symlink("/tmp/photo/real.jpg", kPhoto), 0);
  PhotoConvertJob job = MakeJob({320});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
}

TEST_F(RunFailure, AFailedConverterLeavesNothingBeforeItsFirstOutput) {
  ExpectFailure(StubPlan().Exit(1));
  EXPECT_THAT(OutFiles(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AFailedConverterLeavesTheOutputsItHasWritten) {
  ExpectFailure(StubPlan().WriteOutputs(2).Exit(1));
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("temp_1280.jpg", "temp_320.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AFailedConverterIsAFailureThoughAllOutputsAreThere) {
  WriteFile(ThumbPath(320), "old thumb");
  ExpectFailure(StubPlan().WriteOutputs().Exit(255));
  EXPECT_THAT(OutFiles(),
              UnorderedElementsAre("320.jpg", "temp_1280.jpg", "temp_320.jpg", "temp_120.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AKilledConverter) {
  for (const int signal : {SIGKILL, SIGTERM, SIGSEGV}) {
    SCOPED_TRACE(signal);
    ExpectFailure(StubPlan().WriteOutputs().DieBySignal(signal));
    EXPECT_THAT(OutFiles(), SizeIs(3));
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AConverterThatIsNotInstalled) {
  RemoveTool(kConverterPath);
  PhotoConvertJob job = MakeJob({1280, 320});
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(OutFiles(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AConverterThatMayNotBeRun) {
  RemoveTool(kConverterPath);
  WriteFile(kConverterPath, "no program");
  PhotoConvertJob job = MakeJob({320});
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RunFailure, AFailureDoesNotKeepTheNextRunFromWorking) {
  ExpectFailure(StubPlan().WriteOutputs(1).Exit(1));
  Converter().Plan(StubPlan::Normal());
  PhotoConvertJob job = MakeJob({1280, 320, 120});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg", "120.jpg"));
}

}  // namespace
}  // namespace vela_test
