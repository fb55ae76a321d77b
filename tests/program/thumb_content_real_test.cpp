// Metadata and content of real thumbnails for all photo formats.
#include <algorithm>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

class ThumbContent : public RealProgramTest {
 protected:
  /// Makes all phases.
  void MakeAll() {
    Make();
    Make();
  }

  void ExpectQuadrants(const std::string& photo, const std::string& letters = "RGBY") const {
    EXPECT_TRUE(HasThumbs(photo, kinds_));
    for (const Kind& kind : kinds_) {
      EXPECT_EQ(QuadrantLetters(ThumbOf(photo, kind)), letters) << photo << " " << kind.name;
    }
  }
};

bool IsRawPhoto(const std::string& name) {
  static const Strings kRaw = {"crw", "dng", "nef"};
  return std::count(kRaw.begin(), kRaw.end(), name.substr(name.rfind('.') + 1)) > 0;
}

/// Series of the same photo in many orientations have a separate test.
bool IsOrientationSeries(const std::string& name) {
  return name.compare(0, 10, "landscape_") == 0 || name.compare(0, 9, "portrait_") == 0;
}

bool IsDamaged(const std::string& name) {
  return name == "corrupted.jpg" || name == "invalid.jpg" || name == "cut.jpg";
}

bool IsNear(const Rgb& colour, int red, int green, int blue) {
  const int tolerance = 40;
  return std::abs(colour.red - red) < tolerance && std::abs(colour.green - green) < tolerance &&
         std::abs(colour.blue - blue) < tolerance;
}

}  // namespace

TEST_F(ThumbContent, NoMetadataButTheColourProfile) {
  JpegRecipe recipe = RecipeOf(240, 160);
  recipe.orientation = 1;
  recipe.exif = true;
  recipe.xmp = true;
  recipe.iptc = true;
  recipe.iccProfile = true;
  recipe.comment = "taken on the quay";
  const std::string photo = MakeJpeg(InPhotos("a.jpg"), recipe);
  const JpegMetadata before = ReadJpegMetadata(photo);
  ASSERT_TRUE(before.exif && before.xmp && before.iptc && before.icc && before.comment);
  MakeAll();
  for (const Kind& kind : kinds_) {
    SCOPED_TRACE(kind.name);
    ASSERT_TRUE(IsWholeJpeg(ThumbOf(photo, kind)));
    const JpegMetadata metadata = ReadJpegMetadata(ThumbOf(photo, kind));
    EXPECT_FALSE(metadata.exif);
    EXPECT_FALSE(metadata.xmp);
    EXPECT_FALSE(metadata.iptc);
    EXPECT_FALSE(metadata.comment);
    EXPECT_TRUE(metadata.icc);
  }
}

TEST_F(ThumbContent, NoMetadataWithoutAutoOrientation) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  JpegRecipe recipe;
  recipe.orientation = 6;
  recipe.xmp = true;
  recipe.iptc = true;
  recipe.iccProfile = true;
  const std::string photo = MakeJpeg(InPhotos("a.jpg"), recipe);
  Make();
  for (const Kind& kind : OfPhase(kinds_, 0)) {
    SCOPED_TRACE(kind.name);
    const JpegMetadata metadata = ReadJpegMetadata(ThumbOf(photo, kind));
    EXPECT_FALSE(metadata.exif);
    EXPECT_FALSE(metadata.xmp);
    EXPECT_FALSE(metadata.iptc);
    EXPECT_TRUE(metadata.icc);
  }
}

TEST_F(ThumbContent, NoColourProfileWhereThePhotoHasNone) {
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  Make();
  for (const Kind& kind : OfPhase(kinds_, 0)) {
    ASSERT_TRUE(IsWholeJpeg(ThumbOf(photo, kind)));
    EXPECT_FALSE(ReadJpegMetadata(ThumbOf(photo, kind)).icc) << kind.name;
  }
}

TEST_F(ThumbContent, TransparentPngOnWhite) {
  const std::string photo = MakeTransparentPng(InPhotos("a.png"), 240, 160);
  MakeAll();
  EXPECT_TRUE(HasThumbs(photo, kinds_));
  for (const Kind& kind : kinds_) {
    SCOPED_TRACE(kind.name);
    const auto thumb = DecodeJpeg(ThumbOf(photo, kind));
    ASSERT_TRUE(thumb);
    EXPECT_TRUE(IsNear(thumb->At(0.25, 0.25), 255, 0, 0));
    EXPECT_TRUE(IsNear(thumb->At(0.25, 0.75), 0, 0, 255));
    EXPECT_TRUE(IsNear(thumb->At(0.75, 0.25), 255, 255, 255));
    EXPECT_TRUE(IsNear(thumb->At(0.75, 0.75), 255, 255, 255));
  }
}

TEST_F(ThumbContent, FirstPageOnly) {
  const Strings photos = {
      MakeAnimatedGif(InPhotos("frames.gif"), 4, 240, 160),
      MakeMultiPageTiff(InPhotos("pages.tif"), 3, 240, 160),
      MakeMultiPageTiff(InPhotos("PAGES.TIFF"), 2, 240, 160),
      InPhotos("frames.webp"),
  };
  Draw({InPhotos("frames.gif"), InPhotos("frames.webp")});
  MakeAll();
  for (const std::string& photo : photos) {
    ExpectQuadrants(photo);
    // No files with numbered names for the other pages.
    for (const std::string& name : ListDirectory(MetadataDirOf(photo))) {
      EXPECT_EQ(name.compare(0, 16, "VELAPHOTO_THUMB_"), 0) << photo << " " << name;
    }
  }
}

TEST_F(ThumbContent, LayeredPsdAsAWhole) {
  const std::string photo = InPhotos("layers.psd");
  // The first picture is the one that shows all layers together; the others are the layers. If it
  // had a palette, as a PNG of few colours has, ImageMagick 7 would draw another one instead of it.
  MakePpm("/tmp/whole.ppm", 240, 160);
  Draw({"/tmp/whole.ppm", "(", "-size", "240x160", "xc:grey", ")", "(", "-size", "90x90",
        "xc:black", ")", "-type", "TrueColor", photo});
  MakeAll();
  ExpectQuadrants(photo);
}

TEST_F(ThumbContent, EveryFormatWithASinglePicture) {
  Strings photos;
  for (const char* extension :
       {"jpg", "JPEG", "jpe", "png", "PNG", "gif", "bmp", "tif", "tiff", "webp", "heic", "psd"}) {
    const std::string made = MakeImage("/tmp/made." + std::string(extension), 240, 160);
    photos.push_back(InPhotos("photo." + std::string(extension)));
    CopyFile(made, photos.back());
  }
  MakeAll();
  for (const std::string& photo : photos) {
    ExpectQuadrants(photo);
  }
  ExpectNothingLeftToMake();
}

TEST_F(ThumbContent, CmykJpegInItsColours) {
  JpegRecipe recipe = RecipeOf(240, 160);
  recipe.colour = JpegColour::kCmyk;
  const std::string photo = MakeJpeg(InPhotos("print.jpg"), recipe);
  MakeAll();
  ExpectQuadrants(photo);
  for (const Kind& kind : kinds_) {
    EXPECT_EQ(DecodeJpeg(ThumbOf(photo, kind))->Components(), 3);
  }
}

TEST_F(ThumbContent, GreyJpegStaysGrey) {
  JpegRecipe recipe = RecipeOf(240, 160);
  recipe.colour = JpegColour::kGrey;
  const std::string photo = MakeJpeg(InPhotos("grey.jpg"), recipe);
  const auto source = DecodeJpeg(photo);
  ASSERT_TRUE(source);
  ASSERT_EQ(source->Components(), 1);
  MakeAll();
  EXPECT_TRUE(HasThumbs(photo, kinds_));
  for (const Kind& kind : kinds_) {
    const auto thumb = DecodeJpeg(ThumbOf(photo, kind));
    ASSERT_TRUE(thumb);
    for (const double x : {0.25, 0.75}) {
      for (const double y : {0.25, 0.75}) {
        const Rgb level = source->At(x, y);
        EXPECT_TRUE(IsNear(thumb->At(x, y), level.red, level.green, level.blue))
            << kind.name << " at " << x << ", " << y;
      }
    }
  }
}

// A file that is not a photo gets markers for every kind, counts as completed and does not stop the
// run.
TEST_F(ThumbContent, FilesThatAreNoPhotos) {
  const std::string good = MakeJpeg(InPhotos("m.jpg"));
  const std::string last = MakeJpeg(InPhotos("z.jpg"));
  WriteFile(InPhotos("empty.jpg"), "");
  WriteFile(InPhotos("one.jpg"), "\xff");
  WriteFile(InPhotos("text.jpg"), "Dear Anna,\nthe photos follow.\n");
  WriteFile(InPhotos("empty.tif"), "");
  WriteFile(InPhotos("text.png"), "no picture");
  WriteFileOfSize(InPhotos("zeros.gif"), 5000);
  MakeAll();
  for (const char* name :
       {"empty.jpg", "one.jpg", "text.jpg", "empty.tif", "text.png", "zeros.gif"}) {
    EXPECT_TRUE(IsMarkedFailed(InPhotos(name), kinds_));
  }
  EXPECT_TRUE(HasThumbs(good, kinds_));
  EXPECT_TRUE(HasThumbs(last, kinds_));
  // Twice six failures, and two photos that the second run finished.
  EXPECT_EQ(Progress("completed"), 2 * 6 + 2);
  EXPECT_EQ(Progress("completed_thumb"), 2 * 6 * 6 + 2 * 6);
}

TEST_F(ThumbContent, RepairedPhotoLosesItsMarkers) {
  const std::string photo = InPhotos("a.jpg");
  WriteFile(photo, "half copied");
  Make();
  EXPECT_TRUE(IsMarkedFailed(photo, kinds_));
  MakeJpeg(photo);
  MakeAll();
  EXPECT_TRUE(HasThumbs(photo, kinds_));
}

TEST_F(ThumbContent, CutJpegStopsNothing) {
  const std::string first = MakeJpeg(InPhotos("a.jpg"));
  const std::string cut = MakeTruncatedJpeg(InPhotos("cut.jpg"), 640, 480);
  const std::string last = MakeJpeg(InPhotos("z.jpg"));
  MakeAll();
  EXPECT_TRUE(HasThumbs(first, kinds_));
  EXPECT_TRUE(HasThumbs(last, kinds_));
  // The converter may accept the part that exists.
  EXPECT_TRUE(HasThumbs(cut, kinds_) || IsMarkedFailed(cut, kinds_));
}

// Original files of cameras and phones, and some of our own.
TEST_F(ThumbContent, CameraFilesInFullSize) {
  CopyFile(SourceDirectory() + "/config/thumb-profiles.conf", kProfiles);
  JpegRecipe recipe = RecipeOf(1800, 1350);
  recipe.orientation = 8;
  recipe.iccProfile = true;
  MakeJpeg(InPhotos("own.jpg"), recipe);
  MakeTruncatedJpeg(InPhotos("cut.jpg"), 1800, 1350);
  MakeMultiPageTiff(InPhotos("own.tiff"), 2, 1800, 1350);
  const std::string folder = SharedMediaDirectory();
  for (const std::string& name : ListDirectory(folder.empty() ? kPhotos : folder)) {
    if (!folder.empty() && !IsRawPhoto(name) && !IsOrientationSeries(name) && name != "README.md") {
      CopyFile(folder + "/" + name, InPhotos(name));
    }
  }
  const std::vector<Kind> kinds = FullKinds();
  MakeAll();
  EXPECT_TRUE(OnlyWholeThumbsBelow(kPhotos));
  for (const auto& [name, state] : PhotosBelow(kPhotos)) {
    SCOPED_TRACE(name);
    const std::string photo = InPhotos(name);
    if (IsDamaged(name) && IsMarkedFailed(photo, kinds)) {
      continue;
    }
    ASSERT_TRUE(HasThumbs(photo, kinds));
    const ImageIdentity identity = Identify(photo);
    for (const Kind& kind : kinds) {
      const auto thumb = DecodeJpeg(ThumbOf(photo, kind));
      const int photoSide = kind.fills ? std::min(identity.width, identity.height)
                                       : std::max(identity.width, identity.height);
      const int thumbSide = kind.fills ? std::min(thumb->Width(), thumb->Height())
                                       : std::max(thumb->Width(), thumb->Height());
      EXPECT_EQ(thumbSide, std::min(kind.box, photoSide)) << kind.name;
      EXPECT_FALSE(ReadJpegMetadata(ThumbOf(photo, kind)).exif) << kind.name;
    }
  }
  ExpectNothingLeftToMake();
}

}  // namespace vela_test::real
