// Stopping before a volume is full.
#include <cstdint>

#include "program/stub_program_test.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

constexpr uint64_t kThreshold = 0x40000000;
constexpr const char* kVolume = "/tmp/volume";

std::string NearlyFull(const std::string& photo) {
  return "velathumb:893 Stopping creating thumbs as the disk space is near full, " + photo;
}

class DiskGuard : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    volume_ = std::make_unique<SmallVolume>(kVolume, uint64_t{4} << 30);
  }

  void TearDown() override { volume_.reset(); }

  /// Makes a photo with its metadata directory, so that the program needs no space for that
  /// directory.
  static std::string Put(const std::string& path) {
    MakePhoto(path);
    MakeDirectories(MetadataDirOf(path));
    return path;
  }

  void SetAvailable(uint64_t bytes) const {
    volume_->SetAvailable(bytes);
    ASSERT_EQ(volume_->Available(), bytes);
  }

 private:
  std::unique_ptr<SmallVolume> volume_;
};

TEST_F(DiskGuard, ExactlyTheThresholdIsEnoughForOnePhoto) {
  const std::string first = Put("/tmp/volume/d/a.jpg");
  const std::string second = Put("/tmp/volume/d/b.jpg");
  const std::string third = Put("/tmp/volume/d/c.jpg");
  SetAvailable(kThreshold);
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"/tmp/volume/d"})), ElementsAre(first));
  // The thumbnails of the first photo use the space that the second one would need.
  EXPECT_EQ(MetadataOf(first), kThumbsOfFirstRun);
  EXPECT_THAT(MetadataOf(second), IsEmpty());
  EXPECT_EQ(Progress("completed_thumb"), 3);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/volume/d\n");
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(second)));
  EXPECT_TRUE(HeldLock("/tmp/volume/d/@eaDir").IsHeld());
}

TEST_F(DiskGuard, OnePageBelowStopsAtOnce) {
  const std::string first = Put("/tmp/volume/d/a.jpg");
  Put("/tmp/volume/d/b.jpg");
  WriteFile(Marker(first, "M"), "");
  WriteFile(Marker("/tmp/volume/d/b.jpg", "M"), "");
  SetAvailable(kThreshold - SmallVolume::PageSize());
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run({"/tmp/volume/d"}));
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(first), IsEmpty());
  EXPECT_THAT(MetadataOf("/tmp/volume/d/b.jpg"), ElementsAre("VELAPHOTO_THUMB_M.fail"));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(first)));
}

TEST_F(DiskGuard, StopsThisDirectoryOnly) {
  const std::string first = Put("/tmp/volume/1/a.jpg");
  const std::string second = Put("/tmp/volume/2/a.jpg");
  const std::string below = Put("/tmp/volume/2/below/a.jpg");
  const std::string elsewhere = MakePhoto("/tmp/photos/a.jpg");
  SetAvailable(kThreshold - SmallVolume::PageSize());
  EXPECT_THAT(ReportedPhotos(RunWithDaemon({"/tmp/volume/1", "R:/tmp/volume/2", kPhotos})),
              ElementsAre(elsewhere));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(first), NearlyFull(second), NearlyFull(below)));
  EXPECT_THAT(ConvertedSources(), ElementsAre(elsewhere, Thumb(elsewhere, "XL")));
}

TEST_F(DiskGuard, DoesNotConcernPhotosThatNeedNothing) {
  WriteFile(kSettings, kThreePhasesSizeMap);
  const std::string first = Put("/tmp/volume/d/a.jpg");
  const std::string second = Put("/tmp/volume/d/b.jpg");
  PutThumbs(first, {"XL", "M", "B", "S"});
  SetAvailable(kThreshold - SmallVolume::PageSize());
  EXPECT_THAT(RunWithDaemon({"/tmp/volume/d"}),
              ElementsAre("POST_PHOTO_CONVERT /tmp/volume/d/a.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(second)));
}

TEST_F(DiskGuard, FullVolumeStopsToo) {
  const std::string photo = Put("/tmp/volume/d/a.jpg");
  SetAvailable(0);
  EXPECT_SUCCESS(Run({"/tmp/volume/d"}));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(photo)));
}

}  // namespace
}  // namespace vela_test
