// Sizes of real thumbnails: each kind in its box, aspect kept, nothing enlarged.
#include <algorithm>
#include <cmath>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

struct PhotoSize {
  const char* name;
  int width;
  int height;
};

/// The scale of a thumbnail relative to its photo, at most 1.
double ScaleFor(const PhotoSize& photo, const Kind& kind) {
  const int side =
      kind.fills ? std::min(photo.width, photo.height) : std::max(photo.width, photo.height);
  return std::min(1.0, static_cast<double>(kind.box) / side);
}

class ThumbSizes : public RealProgramTest {
 protected:
  /// Two runs, which make all three phases.
  void MakeAll(const std::vector<PhotoSize>& photos) {
    for (const PhotoSize& photo : photos) {
      JpegRecipe recipe;
      recipe.width = photo.width;
      recipe.height = photo.height;
      MakeJpeg(InPhotos(photo.name), recipe);
    }
    Make();
    Make();
  }

  /// The later phases are made from a thumbnail, whose own size was rounded to whole pixels.
  static void ExpectSize(const PhotoSize& photo, const Kind& kind) {
    SCOPED_TRACE(std::string(photo.name) + " " + kind.name);
    const auto thumb = DecodeJpeg(ThumbOf(InPhotos(photo.name), kind));
    ASSERT_TRUE(thumb);
    const double scale = ScaleFor(photo, kind);
    EXPECT_NEAR(thumb->Width(), std::max(1.0, photo.width * scale), 1.0);
    EXPECT_NEAR(thumb->Height(), std::max(1.0, photo.height * scale), 1.0);
    const int exactSide = kind.fills ? std::min(thumb->Width(), thumb->Height())
                                     : std::max(thumb->Width(), thumb->Height());
    const int photoSide =
        kind.fills ? std::min(photo.width, photo.height) : std::max(photo.width, photo.height);
    EXPECT_EQ(exactSide, std::min(kind.box, photoSide));
    EXPECT_LE(thumb->Width(), photo.width);
    EXPECT_LE(thumb->Height(), photo.height);
  }

  static void ExpectSizes(const std::vector<PhotoSize>& photos, const std::vector<Kind>& kinds) {
    for (const PhotoSize& photo : photos) {
      for (const Kind& kind : kinds) {
        ExpectSize(photo, kind);
      }
    }
  }
};

}  // namespace

TEST_F(ThumbSizes, FillAndFitTheBoxesOfTheSampleProfile) {
  CopyFile(SourceDirectory() + "/config/thumb-profiles.conf", kProfiles);
  const std::vector<PhotoSize> photos = {
      {"landscape.jpg", 2000, 1500}, {"portrait.jpg", 1500, 2000}, {"square.jpg", 1600, 1600}};
  MakeAll(photos);
  ExpectSizes(photos, FullKinds());
  ExpectNothingLeftToMake();
}

TEST_F(ThumbSizes, NeverEnlarge) {
  WriteKinds(kProfiles, FullKinds());
  const std::vector<PhotoSize> photos = {
      {"boundary.jpg", 1280, 1280}, {"narrow.jpg", 100, 2500}, {"one.jpg", 1, 1},
      {"small.jpg", 300, 200},      {"tiny.jpg", 31, 17},      {"wide.jpg", 2500, 300}};
  MakeAll(photos);
  ExpectSizes(photos, FullKinds());
}

TEST_F(ThumbSizes, KeepTheAspectOfOddSizes) {
  const std::vector<PhotoSize> photos = {
      {"a.jpg", 333, 251}, {"b.jpg", 479, 121}, {"c.jpg", 161, 997}, {"d.jpg", 121, 120}};
  MakeAll(photos);
  ExpectSizes(photos, kinds_);
}

// The converter's outputs are sorted by size after the scaling of each has been chosen by its
// position: if a phase mixes both kinds of scaling, they are exchanged.
TEST_F(ThumbSizes, MixedScalingOfOnePhaseIsExchanged) {
  WriteKinds(kProfiles,
             {{"S", 40, false, 0}, {"M", 64, true, 0}, {"B", 80, false, 0}, {"XL", 120, true, 0}});
  const PhotoSize photo = {"a.jpg", 240, 160};
  MakeAll({photo});
  ExpectSizes({photo},
              {{"S", 40, true, 0}, {"M", 64, false, 0}, {"B", 80, true, 0}, {"XL", 120, false, 0}});
}

TEST_F(ThumbSizes, AllSixMixedInOnePhase) {
  WriteKinds(kProfiles, {{"S", 40, false, 0},
                         {"SM", 48, true, 0},
                         {"M", 64, true, 0},
                         {"B", 80, false, 0},
                         {"L", 100, true, 0},
                         {"XL", 120, true, 0}});
  const PhotoSize photo = {"a.jpg", 160, 240};
  MakeAll({photo});
  // L would fill 100, but is made from the XL that is 80 wide.
  ExpectSizes({photo}, {{"S", 40, true, 0},
                        {"SM", 48, true, 0},
                        {"M", 64, false, 0},
                        {"B", 80, true, 0},
                        {"L", 80, true, 0},
                        {"XL", 120, false, 0}});
}

TEST_F(ThumbSizes, NewerPhotoIsConvertedAgain) {
  const PhotoSize before = {"a.jpg", 240, 160};
  MakeAll({before});
  for (const Kind& kind : kinds_) {
    SetFileTimeFromNow(ThumbOf(InPhotos("a.jpg"), kind), -100);
  }
  const PhotoSize after = {"a.jpg", 160, 240};
  MakeAll({after});
  ExpectSizes({after}, kinds_);
}

}  // namespace vela_test::real
