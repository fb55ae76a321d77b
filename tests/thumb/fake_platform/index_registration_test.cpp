// The registration of a new thumbnail with the index.
#include "thumb/index_registration.h"

#include <cstring>

#include "thumb/fake_platform/index_fake.h"
#include "thumb/thumb_test.h"

namespace vela_test {
namespace {

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

TEST_F(Registering, PassesPhotoAndThumbnailWithTheirSizes) {
  MakeSized(kPhoto, 64, 48);
  MakeSized(kThumb, 20, 30);
  RegisterThumbConversion(kPhoto, kThumb);
  ASSERT_THAT(index_.Calls(), SizeIs(1));
  const Registration& call = index_.Calls()[0];
  EXPECT_STREQ(call.photo.path, kPhoto);
  EXPECT_EQ(call.photo.width, 64U);
  EXPECT_EQ(call.photo.height, 48U);
  EXPECT_STREQ(call.thumbnail.path, kThumb);
  EXPECT_EQ(call.thumbnail.width, 20U);
  EXPECT_EQ(call.thumbnail.height, 30U);
  EXPECT_TRUE(call.extra.isObject());
  EXPECT_TRUE(call.extra.empty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Registering, SetsOtherFieldsToZero) {
  MakeSized(kPhoto, 64, 48);
  MakeSized(kThumb, 20, 30);
  // Fills the stack with other values first.
  RegisterThumbConversion(kPhoto, kThumb);
  RegisterThumbConversion(kPhoto, kThumb);
  ASSERT_THAT(index_.Calls(), SizeIs(2));
  for (const Registration& call : index_.Calls()) {
    for (const VELA_MEDIA_INFO& info : {call.photo, call.thumbnail}) {
      EXPECT_EQ(info.type, 0);
      EXPECT_EQ(info.rotation, 0);
      EXPECT_EQ(info.duration, 0);
      EXPECT_EQ(info.bitrate, 0U);
      EXPECT_EQ(info.size, 0);
      EXPECT_EQ(info.mtime, 0);
      const size_t length = std::strlen(info.path);
      EXPECT_EQ(std::string(sizeof info.path - length, '\0'),
                std::string(info.path + length, sizeof info.path - length));
    }
  }
}

TEST_F(Registering, UnreadablePictureIsLoggedAndNotRegistered) {
  const std::string photoLine = "velathumb:469 [Error] GetImageResolution: /tmp/photo.jpg";
  const std::string thumbLine = "velathumb:474 [Error] GetImageResolution: /tmp/thumb.jpg";
  RegisterThumbConversion(kPhoto, kThumb);  // both are missing: the photo is examined first
  EXPECT_THAT(ErrorLines(), ElementsAre(photoLine));
  WriteFile(kPhoto, "no picture");
  MakeSized(kThumb, 20, 30);
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(ErrorLines(), ElementsAre(photoLine, photoLine));
  MakeSized(kPhoto, 64, 48);
  WriteFile(kThumb, "no picture");
  RegisterThumbConversion(kPhoto, kThumb);
  EXPECT_THAT(ErrorLines(), ElementsAre(photoLine, photoLine, thumbLine));
  EXPECT_THAT(index_.Calls(), IsEmpty());
}

TEST(RegisteringRefused, IsSilent) {
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
