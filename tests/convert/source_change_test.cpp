// Photos that change while they are converted.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "convert/convert_fixture.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

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
  /// Runs a job with the converter doing as planned.
  int Run(const StubPlan& plan) {
    Converter().Plan(plan);
    PhotoConvertJob job = MakeJob({1280, 320});
    return RunPhotoConvertJob(job);
  }

  /// Commits outputs that are there, for a photo that had these figures when it was read.
  static int Commit(int64_t oldBlocks, int64_t oldSize) {
    const PhotoConvertJob job = MakeJob({1280, 320});
    WriteFile(TempPath(1280), "first output");
    WriteFile(TempPath(320), "second output");
    return CommitPhotoThumbs(job, kPhoto, oldBlocks, oldSize);
  }

  static void ExpectCommitted() {
    EXPECT_THAT(OutFiles(), UnorderedElementsAre("1280.jpg", "320.jpg"));
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
};

TEST_F(SourceChange, OfSizeAndBlocksRefusesTheOutputs) {
  const SourceFigures before = Figures();
  EXPECT_EQ(Run(StubPlan().WriteOutputs(1).AppendToSource(100000).WriteOutputs()), -1);
  const SourceFigures now = Figures();
  ASSERT_NE(now.size, before.size);
  ASSERT_NE(now.blocks, before.blocks);
  EXPECT_THAT(OutFiles(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(ChangeLine(before, now)));
}

TEST_F(SourceChange, KeepsTheOldThumbs) {
  WriteFile(ThumbPath(320), "old thumb");
  EXPECT_EQ(Run(StubPlan().WriteOutputs().AppendToSource(100000)), -1);
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
}

TEST_F(SourceChange, OfTheSizeAloneIsAccepted) {
  const SourceFigures before = Figures();
  EXPECT_EQ(Run(StubPlan().WriteOutputs().GrowSizeOnly(StubPlan::kSource, 100000)), 0);
  ASSERT_NE(Figures().size, before.size);
  ASSERT_EQ(Figures().blocks, before.blocks);
  ExpectCommitted();
}

TEST_F(SourceChange, OfTheBlocksAloneIsAccepted) {
  const SourceFigures before = Figures();
  EXPECT_EQ(Run(StubPlan().WriteOutputs().GrowBlocksOnly(StubPlan::kSource, 100000)), 0);
  ASSERT_EQ(Figures().size, before.size);
  ASSERT_NE(Figures().blocks, before.blocks);
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
  EXPECT_THAT(ErrorLines(), ElementsAre(ChangeLine({now.size + 1, now.blocks + 1}, now),
                                        ChangeLine({now.size - 1, now.blocks - 1}, now)));
}

TEST_F(SourceChange, OfLargePhotosIsSeenInAllBits) {
  ASSERT_EQ(truncate(kPhoto, (off_t{1} << 32) + 20000), 0);  // sparse
  const SourceFigures now = Figures();
  EXPECT_EQ(Commit(now.blocks + 8, 20000), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre(ChangeLine({20000, now.blocks + 8}, now)));
  EXPECT_EQ(Commit(now.blocks + (int64_t{1} << 32), now.size + 1), -1);
}

TEST_F(SourceChange, ARemovedPhotoRefusesTheOutputs) {
  WriteFile(ThumbPath(320), "old thumb");
  EXPECT_EQ(Run(StubPlan().WriteOutputs().Remove(StubPlan::kSource)), -1);
  EXPECT_THAT(OutFiles(), ElementsAre("320.jpg"));
  EXPECT_EQ(ReadFile(ThumbPath(320)), "old thumb");
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:397 Failed to VLIBCFileStat() path "
                                        "[/tmp/photo/a.jpg]"));
}

TEST_F(SourceChange, OutputsThatAreNotThereAreNoMatter) {
  EXPECT_EQ(Run(StubPlan().WriteOutputs(1).Remove(StubPlan::kSource)), -1);
  EXPECT_THAT(OutFiles(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:397 Failed to VLIBCFileStat() path "
                                        "[/tmp/photo/a.jpg]"));
}

TEST_F(SourceChange, ACommitWithoutSettingsIsDone) {
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), kPhoto, Figures().blocks, Figures().size), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(SourceChange, IsReportedThoughNothingIsToBeCommitted) {
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), "/tmp/photo/nowhere.jpg", 0, 0), -1);
  EXPECT_EQ(CommitPhotoThumbs(PhotoConvertJob(), kPhoto, Figures().blocks + 1, 0), -1);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_photo_thumb:397 Failed to VLIBCFileStat() path "
                                        "[/tmp/photo/nowhere.jpg]",
                                        ChangeLine({0, Figures().blocks + 1}, Figures())));
}

}  // namespace
}  // namespace vela_test
