// What the index is told of a made thumbnail.
#include "thumb/index_registration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "support/files.h"
#include "support/images.h"
#include "support/sandbox.h"
#include "support/system_log.h"
#include "thumb/fake_platform/index_fake.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kPhoto = "/tmp/photo.jpg";
constexpr const char* kThumb = "/tmp/thumb.jpg";

class Registering : public SandboxTest {
 protected:
  static void MakeSized(const std::string& path, int width, int height) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    MakeJpeg(path, recipe);
  }

  IndexFake index_;
};

TEST_F(Registering, TellsPhotoAndThumbnailWithTheirSizes) {
  MakeSized(kPhoto, 64, 48);
  MakeSized(kThumb, 20, 30);
  RegisterThumbConversion(kPhoto, kThumb);
  ASSERT_THAT(index_.Calls(), SizeIs(1));
  const Registration& call = index_.Calls()[0];
  EXPECT_STREQ(kPhoto, call.photo.path);
  EXPECT_EQ(64U, call.photo.width);
  EXPECT_EQ(48U, call.photo.height);
  EXPECT_STREQ(kThumb, call.thumbnail.path);
  EXPECT_EQ(20U, call.thumbnail.width);
  EXPECT_EQ(30U, call.thumbnail.height);
  EXPECT_TRUE(call.extra.isObject());
  EXPECT_TRUE(call.extra.empty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Registering, LeavesEverythingElseZero) {
  MakeSized(kPhoto, 64, 48);
  MakeSized(kThumb, 20, 30);
  // Whatever lay there before on the stack.
  RegisterThumbConversion(kPhoto, kThumb);
  RegisterThumbConversion(kPhoto, kThumb);
  ASSERT_THAT(index_.Calls(), SizeIs(2));
  for (const Registration& call : index_.Calls()) {
    for (const VELA_MEDIA_INFO& info : {call.photo, call.thumbnail}) {
      EXPECT_EQ(0, info.type);
      EXPECT_EQ(0, info.rotation);
      EXPECT_EQ(0, info.duration);
      EXPECT_EQ(0U, info.bitrate);
      EXPECT_EQ(0, info.size);
      EXPECT_EQ(0, info.mtime);
      const size_t length = std::strlen(info.path);
      EXPECT_EQ(std::string(sizeof info.path - length, '\0'),
                std::string(info.path + length, sizeof info.path - length));
    }
  }
}

TEST_F(Registering, UnreadablePhotoIsLoggedAndNotRegistered) {
  WriteFile(kPhoto, "no picture");
  MakeSized(kThumb, 20, 30);
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(index_.Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:469 [Error] GetImageResolution: /tmp/photo.jpg"));
}

TEST_F(Registering, UnreadableThumbnailIsLoggedAndNotRegistered) {
  MakeSized(kPhoto, 64, 48);
  WriteFile(kThumb, "no picture");
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(index_.Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:474 [Error] GetImageResolution: /tmp/thumb.jpg"));
}

TEST_F(Registering, ThePhotoIsExaminedFirst) {
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(index_.Calls(), IsEmpty());
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:469 [Error] GetImageResolution: /tmp/photo.jpg"));
}

TEST(RegisteringRefused, PassesInSilence) {
  ResetSandbox();
  const IndexFake index(-1);
  MakeJpeg(kPhoto);
  MakeJpeg(kThumb);
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(index.Calls(), SizeIs(1));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
