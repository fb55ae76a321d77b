// The stop before a volume is full.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

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

  /// Puts a photo with its metadata directory, so that making it takes nothing of the volume.
  static std::string Put(const std::string& path) {
    MakePhoto(path);
    MakeDirectories(MetadataDirOf(path));
    return path;
  }

  void SetAvailable(uint64_t bytes) const {
    volume_->SetAvailable(bytes);
    ASSERT_EQ(bytes, volume_->Available());
  }

 private:
  std::unique_ptr<SmallVolume> volume_;
};

TEST_F(DiskGuard, ExactlyTheThresholdIsEnoughForOnePhoto) {
  const std::string first = Put("/tmp/volume/d/a.jpg");
  const std::string second = Put("/tmp/volume/d/b.jpg");
  const std::string third = Put("/tmp/volume/d/c.jpg");
  SetAvailable(kThreshold);
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/volume/d"}));
  // The thumbnails of the first photo take away what the second one would need.
  EXPECT_THAT(MetadataOf(first), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                             "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(MetadataOf(second), IsEmpty());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(first));
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_EQ("/tmp/volume/d\n", ReadFile(kQueue));
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
  EXPECT_GOOD_END(Run({"/tmp/volume/d"}));
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
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/volume/1", "R:/tmp/volume/2", kPhotos}));
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(elsewhere));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(first), NearlyFull(second), NearlyFull(below)));
  EXPECT_THAT(ConvertedSources(), ElementsAre(elsewhere, Thumb(elsewhere, "XL")));
}

TEST_F(DiskGuard, LetsPhotosPassThatNeedNothing) {
  WriteFile(kSettings, kThreePhasesSizeMap);
  const std::string first = Put("/tmp/volume/d/a.jpg");
  const std::string second = Put("/tmp/volume/d/b.jpg");
  PutThumbs(first, {"XL", "M", "B", "S"});
  SetAvailable(kThreshold - SmallVolume::PageSize());
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/volume/d"}));
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("POST_PHOTO_CONVERT /tmp/volume/d/a.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(second)));
}

TEST_F(DiskGuard, FullVolumeStopsToo) {
  const std::string photo = Put("/tmp/volume/d/a.jpg");
  SetAvailable(0);
  EXPECT_GOOD_END(Run({"/tmp/volume/d"}));
  EXPECT_THAT(ErrorLines(), ElementsAre(NearlyFull(photo)));
}

}  // namespace
}  // namespace vela_test
