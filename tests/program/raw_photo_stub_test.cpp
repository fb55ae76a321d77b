// Camera raw photos that cannot be decoded.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "program/callback_daemon.h"
#include "program/stub_program_test.h"
#include "support/files.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kRaw = "/tmp/photos/a.nef";

class BrokenRawPhoto : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    decoder_ = std::make_unique<StubTool>(kDcrawPath);
    decoder_->Plan(StubPlan().Exit(1));
    WriteFile(kRaw, "");
    SetFileTimeFromNow(kRaw, -60);
  }

 private:
  std::unique_ptr<StubTool> decoder_;
};

TEST_F(BrokenRawPhoto, FailsInAllPhases) {
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.nef"));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kRaw), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                            "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_EQ(1, Progress("completed"));
  EXPECT_EQ(4, Progress("completed_thumb"));
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(BrokenRawPhoto, LosesTheThumbnailsItHad) {
  PutThumbs(kRaw, {"XL", "B", "S"});
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(MetadataOf(kRaw), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                            "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
}

TEST_F(BrokenRawPhoto, IsCountedBeforeItIsReported) {
  std::string seen;
  CallbackDaemon daemon([&](const std::string&, const std::string&) {
    seen = ReadFile(kPhotoProgress);
    return kDone;
  });
  EXPECT_GOOD_END(Run());
  daemon.Stop();
  EXPECT_EQ("completed=\"1\"\ncompleted_thumb=\"4\"\n", seen);
}

TEST_F(BrokenRawPhoto, DoesNotStopTheOthers) {
  MakePhoto("/tmp/photos/b.jpg");
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre(kRaw, "/tmp/photos/b.jpg"));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/b.jpg", "B")));
}

TEST_F(BrokenRawPhoto, IsNotDecodedForLaterPhases) {
  PutThumbs(kRaw, {"XL", "M"});
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kRaw, "XL"), Thumb(kRaw, "XL")));
  EXPECT_EQ(2U, AllStubCalls().size());
  EXPECT_EQ(1, Progress("completed"));
  EXPECT_EQ(2, Progress("completed_thumb"));
}

}  // namespace
}  // namespace vela_test
