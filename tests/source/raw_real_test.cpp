// From a raw photo to an ordinary image, with the real tools on real raw photos.

#include "source/raw_image.h"
#include "source/source_fixture.h"
#include "support/build_paths.h"
#include "support/program.h"

using namespace vela;

namespace vela_test {
namespace {

class RealRaw : public SourceTest {
 protected:
  void SetUp() override {
    SourceTest::SetUp();
    InstallRealTools();
  }

  /// The image made from `raw` for thumbnails up to this size.
  std::string Convert(int largest, const std::string& raw = kRaw) {
    ThumbnailProfileList list;
    list.all.push_back(
        std::make_unique<const ThumbnailProfile>(largest, 90, "", "VELAPHOTO_THUMB_XL.jpg", 0));
    list.phase0.push_back(list.all.back().get());
    return ConvertRawToJpeg({"/tmp/photos", list}, raw, kThumbDir);
  }

  /// Expects the returned file and no other.
  static void ExpectOnly(const std::string& result) {
    if (result.empty()) {
      EXPECT_THAT(ThumbDirFiles(), IsEmpty());
    } else {
      EXPECT_THAT(ThumbDirFiles(), ElementsAre(result.substr(result.rfind('/') + 1)));
      EXPECT_GT(FileSize(result), 0);
    }
  }

  /// The quadrants of a PPM.
  static std::string LettersOfPpm(const std::string& path) {
    const ProgramResult result = RunProgram(kConverterPath, {path, "/tmp/decoded.jpg"});
    EXPECT_EQ(result.exitCode, 0) << result.err;
    return QuadrantLetters("/tmp/decoded.jpg");
  }
};

TEST_F(RealRaw, GivesItsPreviewWhenThatIsLargeEnough) {
  MakeRawPhoto(kRaw, RawWithPreview(120, 80));
  EXPECT_EQ(Convert(120), kPreview);
  ExpectOnly(kPreview);
  EXPECT_EQ(QuadrantLetters(kPreview), "RGBY");
  EXPECT_EQ(Identify(kPreview).width, 120);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RealRaw, IsDecodedWhenThePreviewIsTooSmall) {
  MakeRawPhoto(kRaw, RawWithPreview(120, 80));
  EXPECT_EQ(Convert(121), kPpm);
  ExpectOnly(kPpm);
  EXPECT_EQ(LettersOfPpm(kPpm), "RGBY");
  EXPECT_EQ(Identify(kPpm).width, 240);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RealRaw, IsDecodedWhenItHasNoPreview) {
  MakeRawPhoto(kRaw);
  EXPECT_EQ(Convert(16), kPpm);
  ExpectOnly(kPpm);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(RealRaw, IsDecodedWhenItsPreviewIsCut) {
  RawRecipe recipe = RawWithPreview(120, 80);
  recipe.previewBytes = 100;
  MakeRawPhoto(kRaw, recipe);
  EXPECT_EQ(Convert(16), kPpm);
  ExpectOnly(kPpm);
}

TEST_F(RealRaw, HasItsPreviewTurnedAsItStates) {
  for (const int degrees : {0, 90, 180, 270}) {
    SCOPED_TRACE(degrees);
    RawRecipe recipe = RawWithPreview(120, 80);
    recipe.rotation = degrees;
    MakeRawPhoto(kRaw, recipe);
    ClearLog();
    EXPECT_EQ(Convert(120), kPreview);
    ExpectOnly(kPreview);
    EXPECT_EQ(QuadrantLetters(kPreview), LettersAfterTurn(degrees));
    EXPECT_EQ(ErrorLines().size(), degrees == 0 ? 0U : 1U);
  }
}

TEST_F(RealRaw, WithAnOrientationHasAPreviewWithThisTag) {
  RawRecipe recipe = RawWithPreview(120, 80);
  recipe.orientation = 6;
  recipe.rotation = 90;
  MakeRawPhoto(kRaw, recipe);
  EXPECT_EQ(Convert(120), kPreview);
  EXPECT_EQ(QuadrantLetters(kPreview), "RGBY");
  EXPECT_EQ(ReadJpegMetadata(kPreview).orientation, 6);
  EXPECT_EQ(Convert(240), kPpm);
  EXPECT_EQ(LettersOfPpm(kPpm), LettersAfterOrientation(6));
}

TEST_F(RealRaw, ThatIsNoPhotoGivesNothing) {
  for (const std::string& content :
       {std::string(), std::string("no photo"), std::string(5000, '\0')}) {
    WriteFile(kRaw, content);
    ClearLog();
    EXPECT_EQ(Convert(16), "");
    ExpectOnly("");
    EXPECT_THAT(ErrorLines(),
                ElementsAre("velathumb:660 Failed to convert raw /tmp/photos/a.dng to pnm"));
  }
}

class RawOfAnyMaker : public RealRaw {
 protected:
  /// Converts it in an empty directory, where nothing but the result remains.
  std::string ConvertInEmptyDirectory(int largest, const std::string& raw) {
    RemoveTree(kThumbDir);
    MakeDirectories(kThumbDir);
    const std::string result = Convert(largest, raw);
    ExpectOnly(result);
    return result;
  }

  /// An undamaged raw photo whose preview and full decode have longer sides of these sizes.
  void ExpectWhole(const std::string& raw, int preview, int full) {
    SCOPED_TRACE(raw);
    EXPECT_EQ(ConvertInEmptyDirectory(preview, raw), kPreview);
    EXPECT_EQ(Identify(kPreview).width, preview);
    EXPECT_EQ(ConvertInEmptyDirectory(preview + 1, raw), kPpm);
    EXPECT_EQ(Identify(kPpm).width, full);
    EXPECT_THAT(ErrorLines(), IsEmpty());
  }
};

TEST_F(RawOfAnyMaker, GivesPreviewOrFullDecode) {
  ExpectWhole(MakeRawPhoto("/tmp/own/a.dng", RawWithPreview(120, 80)), 120, 240);
  const std::string camera = SharedMediaDirectory() + "/camera_raw.crw";
  if (IsRegularFile(camera)) {
    ExpectWhole(camera, 1440, 2176);
  }
}

TEST_F(RawOfAnyMaker, LeavesOneImageOrNoneWhenItIsCut) {
  const std::string whole = ReadFile(MakeRawPhoto("/tmp/own/a.dng", RawWithPreview(120, 80)));
  for (const size_t part : {1U, 10U, 50U, 99U}) {
    WriteFile("/tmp/own/cut.dng", whole.substr(0, whole.size() * part / 100));
    ConvertInEmptyDirectory(120, "/tmp/own/cut.dng");
  }
  const std::string folder = SharedMediaDirectory();
  for (const char* name : {"/tiny_preview.nef", "/broken_preview.dng"}) {
    if (IsRegularFile(folder + name)) {
      EXPECT_NE(ConvertInEmptyDirectory(1280, folder + name), kPreview);
    }
  }
}

}  // namespace
}  // namespace vela_test
