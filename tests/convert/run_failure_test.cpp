// Photos that are rejected or change while they are converted, and converters that fail.
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>

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
  /// Runs a job of these widths with this plan for the converter; expects it to fail.
  void ExpectFailure(const StubPlan& plan, const std::vector<int>& widths = {1280, 320, 120}) {
    Converter().Plan(plan);
    PhotoConvertJob job = MakeJob(widths);
    EXPECT_EQ(RunPhotoConvertJob(job), -1);
  }

  /// Runs a job whose source is rejected before the converter is started.
  void ExpectRefused(const std::string& line) {
    PhotoConvertJob job = MakeJob({1280, 320});
    WriteFile(TempPath(320), "not of this run");
    EXPECT_EQ(RunPhotoConvertJob(job), -1);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
    EXPECT_THAT(Converter().Calls(), IsEmpty());
    EXPECT_THAT(OutFiles(), ElementsAre("temp_320.jpg"));
  }
};

TEST_F(RunFailure, AMissingPhotoIsRefused) {
  const std::string line = "velamk_photo_thumb:117 [Error] failed to stat file: ";
  RemoveTree(kPhoto);
  ExpectRefused(line + kPhoto);
  ASSERT_EQ(symlink("/tmp/photo/nowhere", kPhoto), 0);
  ExpectRefused(line + kPhoto);
  PhotoConvertJob job = MakeJob({320});
  job.settings[0].srcPath = "";
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
}

TEST_F(RunFailure, OnlyRegularFilesAreAccepted) {
  const char* line = "velamk_photo_thumb:121 [Error] not a regular file: /tmp/photo/a.jpg";
  RemoveTree(kPhoto);
  MakeDirectories(kPhoto);
  ExpectRefused(line);
  RemoveTree(kPhoto);
  ASSERT_EQ(mkfifo(kPhoto, 0666), 0);
  ExpectRefused(line);
}

TEST_F(RunFailure, ALinkToAPhotoIsAPhoto) {
  ASSERT_EQ(rename(kPhoto, "/tmp/photo/real.jpg"), 0);
  ASSERT_EQ(symlink("/tmp/photo/real.jpg", kPhoto), 0);
  PhotoConvertJob job = MakeJob({320});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
}

TEST_F(RunFailure, OutputsOfAFailedConverterAreNotCommitted) {
  WriteFile(ThumbPath(320), "old thumb");
  ExpectFailure(StubPlan().Exit(1));
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
  ExpectFailure(StubPlan().WriteOutputs(2).Exit(1));
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("320.jpg", "temp_1280.jpg", "temp_320.jpg"));
  ExpectFailure(StubPlan().WriteOutputs().Exit(255));
  EXPECT_THAT(OutFiles(),
              UnorderedElementsAre("320.jpg", "temp_1280.jpg", "temp_320.jpg", "temp_120.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
}

TEST_F(RunFailure, AKilledConverter) {
  for (const int signal : {SIGKILL, SIGTERM, SIGSEGV}) {
    SCOPED_TRACE(signal);
    ExpectFailure(StubPlan().WriteOutputs().DieBySignal(signal));
    EXPECT_THAT(OutFiles(), SizeIs(3));
  }
}

TEST_F(RunFailure, AConverterThatCannotBeStarted) {
  RemoveTool(kConverterPath);
  PhotoConvertJob job = MakeJob({1280, 320});
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  WriteFile(kConverterPath, "no program");
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(OutFiles(), IsEmpty());
}

TEST_F(RunFailure, AFailureDoesNotAffectTheNextRun) {
  ExpectFailure(StubPlan().WriteOutputs(1).Exit(1));
  Converter().Plan(StubPlan::Normal());
  PhotoConvertJob job = MakeJob({1280, 320, 120});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg", "120.jpg"));
}

struct SourceFigures {
  int64_t size = 0;
  int64_t blocks = 0;
};

SourceFigures Figures() {
  struct stat status = {};
  EXPECT_EQ(stat(kPhoto, &status), 0);
  return {status.st_size, status.st_blocks};
}

std::string ChangeLine(const SourceFigures& before, const SourceFigures& now) {
  return "velamk_photo_thumb:409 [Error] file size changed: st_blocks " +
         std::to_string(before.blocks) + " -> " + std::to_string(now.blocks) + "; st_size " +
         std::to_string(before.size) + " -> " + std::to_string(now.size) + ", /tmp/photo/a.jpg";
}

class SourceChange : public ConvertTest {
 protected:
  /// Runs a job with this plan for the converter.
  int Run(const StubPlan& plan) {
    Converter().Plan(plan);
    PhotoConvertJob job = MakeJob({1280, 320});
    return RunPhotoConvertJob(job);
  }

  /// Commits finished outputs of a photo that had these block and byte counts when it was read.
  static int Commit(int64_t oldBlocks, int64_t oldSize) {
    const PhotoConvertJob job = MakeJob({1280, 320});
    WriteFile(TempPath(1280), "first output");
    WriteFile(TempPath(320), "second output");
    return CommitPhotoThumbs(job, kPhoto, oldBlocks, oldSize);
  }

  static void ExpectCommitted() {
    EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg"));
  }
};

TEST_F(SourceChange, OfSizeAndBlocksRefusesTheOutputs) {
  WriteFile(ThumbPath(320), "old thumb");
  const SourceFigures before = Figures();
  EXPECT_EQ(Run(StubPlan().WriteOutputs(1).AppendToSource(100000).WriteOutputs()), -1);
  const SourceFigures now = Figures();
  ASSERT_NE(now.size, before.size);
  ASSERT_NE(now.blocks, before.blocks);
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
  EXPECT_THAT(TakeErrorLines(), ElementsAre(ChangeLine(before, now)));
}

TEST_F(SourceChange, OfSizeOrBlocksAloneIsAccepted) {
  const SourceFigures first = Figures();
  EXPECT_EQ(Run(StubPlan().WriteOutputs().GrowSizeOnly(StubPlan::kSource, 100000)), 0);
  const SourceFigures second = Figures();
  ASSERT_NE(second.size, first.size);
  ASSERT_EQ(second.blocks, first.blocks);
  ExpectCommitted();
  EXPECT_EQ(Run(StubPlan().WriteOutputs().GrowBlocksOnly(StubPlan::kSource, 100000)), 0);
  ASSERT_EQ(Figures().size, second.size);
  ASSERT_NE(Figures().blocks, second.blocks);
  ExpectCommitted();
}

TEST_F(SourceChange, OfTheTimeAloneIsAccepted) {
  EXPECT_EQ(Run(StubPlan().WriteOutputs().SetFileTime(StubPlan::kSource, 1000000000)), 0);
  ExpectCommitted();
}

TEST_F(SourceChange, IsJudgedByBothFiguresAtTheCommit) {
  const SourceFigures now = Figures();
  EXPECT_EQ(Commit(now.blocks, now.size), 0);
  EXPECT_EQ(Commit(now.blocks + 8, now.size), 0);
  EXPECT_EQ(Commit(now.blocks, now.size - 1), 0);
  EXPECT_EQ(Commit(0, now.size), 0);
  ExpectCommitted();
  EXPECT_EQ(Commit(now.blocks + 1, now.size + 1), -1);
  EXPECT_EQ(Commit(now.blocks - 1, now.size - 1), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(ChangeLine({now.size + 1, now.blocks + 1}, now),
                                            ChangeLine({now.size - 1, now.blocks - 1}, now)));
}

TEST_F(SourceChange, OfLargePhotosIsSeenInAllBits) {
  ASSERT_EQ(truncate(kPhoto, (off_t{1} << 32) + 20000), 0);  // sparse
  const SourceFigures now = Figures();
  EXPECT_EQ(Commit(now.blocks + 8, 20000), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(ChangeLine({20000, now.blocks + 8}, now)));
  EXPECT_EQ(Commit(now.blocks + (int64_t{1} << 32), now.size + 1), -1);
  // The message shows only 32 bits of the block count.
  EXPECT_THAT(TakeErrorLines(), ElementsAre(ChangeLine({now.size + 1, now.blocks}, now)));
}

TEST_F(SourceChange, ARemovedPhotoRefusesTheOutputs) {
  const char* line = "velamk_photo_thumb:397 Failed to VLIBCFileStat() path [/tmp/photo/a.jpg]";
  WriteFile(ThumbPath(320), "old thumb");
  for (const int written : {2, 1}) {
    EXPECT_EQ(Run(StubPlan().WriteOutputs(written).Remove(StubPlan::kSource)), -1);
    EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
    EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
    EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
    WriteFileOfSize(kPhoto, 20000);
  }
}

TEST_F(SourceChange, ACommitWithoutSettingsSucceeds) {
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), kPhoto, Figures().blocks, Figures().size), 0);
}

TEST_F(SourceChange, IsReportedEvenWithoutSettings) {
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), "/tmp/photo/nowhere.jpg", 0, 0), -1);
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), kPhoto, Figures().blocks + 1, 0), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_photo_thumb:397 Failed to VLIBCFileStat() path "
                                            "[/tmp/photo/nowhere.jpg]",
                                            ChangeLine({0, Figures().blocks + 1}, Figures())));
}

}  // namespace
}  // namespace vela_test
