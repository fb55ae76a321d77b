// A volume that fills up while photos are converted.
#include <algorithm>
#include <random>
#include <thread>

#include "program/real_program_test.h"
#include "support/mounts.h"

namespace vela_test::real {

namespace {

/// More than the free space that the program requires to convert a photo.
constexpr uint64_t kRoomy = 1200ULL << 20U;

class FullDisk : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    volume_.emplace(kPhotos, kRoomy + (64ULL << 20U));
  }

  /// Detailed enough for thumbnails of many pages.
  static std::string MakeDetailedPhoto(const std::string& name) {
    Draw({"-size", "640x480", "-seed", "7", "plasma:red-blue", "-quality", "92", InPhotos(name)});
    return InPhotos(name);
  }

  void MakeRoom() {
    RemoveTree(InPhotos("@eaDir"));
    volume_->SetAvailable(kRoomy);
  }

  /// Whether there are no thumbnails of these kinds, only markers, or nothing if the markers did
  /// not fit either.
  static bool HasNoThumbs(const std::string& photo, const std::vector<Kind>& kinds) {
    return std::none_of(kinds.begin(), kinds.end(),
                        [&](const Kind& kind) { return Exists(ThumbOf(photo, kind)); });
  }

  std::optional<SmallVolume> volume_;
};

}  // namespace

TEST_F(FullDisk, FullBeforeTheFirstOutput) {
  const std::string photo = MakeDetailedPhoto("a.jpg");
  MakeDetailedPhoto("b.jpg");
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().FillVolume(kPhotos).PassThrough(RealConverterPath()));
  const DaemonPeer daemon;
  Make();
  EXPECT_EQ(converter.Calls().size(), 1U);
  EXPECT_TRUE(ThumbsBelow(kPhotos).empty());
  // The volume is too full to start the next photo. The converter's own line has a random name in
  // it, and ImageMagick has none.
  EXPECT_THAT(ErrorLines(),
              ::testing::Contains("velathumb:893 Stopping creating thumbs as the disk space is "
                                  "near full, " +
                                  InPhotos("b.jpg")));
  EXPECT_THAT(ErrorLines(),
              ::testing::Each(::testing::AnyOf(
                  ::testing::StartsWith("velathumb:893 "),
                  ::testing::StartsWith("convert-thumb: " + photo + ": cannot write "))));
  // The failure is not permanent: with enough space, everything is made.
  MakeRoom();
  InstallRealConverter();
  Make();
  EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 0)));
}

TEST_F(FullDisk, FullBetweenTwoOutputs) {
  WriteKinds(kProfiles, FullKinds());
  const std::string photo = MakeDetailedPhoto("a.jpg");
  const StubTool converter(kConverterPath);
  converter.PlanCall(2, StubPlan().FillVolume(kPhotos).PassThrough(RealConverterPath()));
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  Make();
  EXPECT_EQ(converter.Calls().size(), 2U);
  EXPECT_TRUE(HasThumbs(photo, OfPhase(FullKinds(), 0)));
  EXPECT_TRUE(HasNoThumbs(photo, OfPhase(FullKinds(), 1)));
  EXPECT_TRUE(OnlyWholeThumbsBelow(kPhotos));
}

// Space for one more page each time, so that the volume becomes full at every point of the outputs.
TEST_F(FullDisk, FullAnywhereInTheOutputs) {
  WriteKinds(kProfiles, FullKinds());
  const std::string photo = MakeDetailedPhoto("a.jpg");
  const std::vector<Kind> phase0 = OfPhase(FullKinds(), 0);
  StubTool converter(kConverterPath);
  converter.PlanWhen(
      photo,
      StubPlan().CreateFile("/tmp/begun").WaitForFile("/tmp/go").PassThrough(RealConverterPath()));
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  int made = 0;
  int failed = 0;
  for (uint64_t pages = 0; pages < 200 && made == 0; pages += pages < 4 ? 1 : 5) {
    SCOPED_TRACE("room for " + std::to_string(pages) + " pages");
    MakeRoom();
    RemoveTree("/tmp/begun");
    RemoveTree("/tmp/go");
    Program program = StartProgram(VelathumbPath(), {kProfiles, kPhotos});
    ASSERT_TRUE(WaitUntilExists("/tmp/begun"));
    const auto before = PhotosBelow(kPhotos);
    volume_->SetAvailable(pages * SmallVolume::PageSize());
    WriteFile("/tmp/go", "");
    const auto result = program.Wait();
    ASSERT_TRUE(result);
    EXPECT_EQ(result->exitCode, 0) << result->err;
    EXPECT_TRUE(PhotosBelow(kPhotos) == before);
    ASSERT_TRUE(OnlyWholeThumbsBelow(kPhotos));
    ASSERT_TRUE(HasThumbs(photo, phase0) || HasNoThumbs(photo, phase0));
    ++(HasNoThumbs(photo, phase0) ? failed : made);
  }
  EXPECT_GT(failed, 8);
  EXPECT_EQ(made, 1);
}

TEST_F(FullDisk, FullAtRandomMomentsOfARun) {
  for (int i = 0; i < 24; ++i) {
    MakeJpeg(InPhotos(std::to_string(i) + ".jpg"));
  }
  const auto before = PhotosBelow(kPhotos);
  const unsigned seed = std::random_device()();
  std::mt19937 random(seed);
  for (int trial = 0; trial < 15; ++trial) {
    MakeRoom();
    const int moment = std::uniform_int_distribution<int>(0, 300)(random);
    SCOPED_TRACE("seed " + std::to_string(seed) + ", trial " + std::to_string(trial) + ", after " +
                 std::to_string(moment) + " ms");
    Program program = StartProgram(VelathumbPath(), {kProfiles, kPhotos});
    std::this_thread::sleep_for(std::chrono::milliseconds(moment));
    volume_->SetAvailable(0);
    const auto result = program.Wait();
    ASSERT_TRUE(result);
    EXPECT_EQ(result->exitCode, 0) << result->err;
    EXPECT_TRUE(PhotosBelow(kPhotos) == before);
    ASSERT_TRUE(OnlyWholeThumbsBelow(kPhotos));
  }
}

}  // namespace vela_test::real
