// The orientation of real thumbnails.
#include <cmath>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

constexpr int kWidth = 240;
constexpr int kHeight = 160;

class ThumbOrientation : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    for (int orientation = 1; orientation <= 8; ++orientation) {
      MakeJpeg(Photo(orientation), RecipeOf(kWidth, kHeight, orientation));
    }
  }

  static std::string Photo(int orientation) {
    return InPhotos("orientation_" + std::to_string(orientation) + ".jpg");
  }

  /// Checks the quadrants and the shape; a remaining tag would turn the picture a second time.
  static void ExpectThumb(int orientation, const Kind& kind, const std::string& letters,
                          bool portrait) {
    SCOPED_TRACE("orientation " + std::to_string(orientation) + " " + kind.name);
    const std::string path = ThumbOf(Photo(orientation), kind);
    const auto thumb = DecodeJpeg(path);
    ASSERT_TRUE(thumb);
    EXPECT_EQ(QuadrantLetters(path), letters);
    EXPECT_EQ(thumb->Height() > thumb->Width(), portrait);
    EXPECT_EQ(ReadJpegMetadata(path).orientation, 0);
  }

  /// Makes two runs; expects all thumbnails upright, or else as stored.
  void ExpectMade(bool upright) {
    Make();
    Make();
    for (int orientation = 1; orientation <= 8; ++orientation) {
      for (const Kind& kind : kinds_) {
        ExpectThumb(orientation, kind, upright ? LettersAfterOrientation(orientation) : "RGBY",
                    upright && orientation >= 5);
      }
    }
  }
};

/// Mean difference of two pictures over a grid, in levels of a channel, the second one mirrored in
/// the given directions.
double MeanDifference(const DecodedImage& a, const DecodedImage& b, bool mirrorX, bool mirrorY) {
  constexpr int kPoints = 16;
  double sum = 0;
  for (int point = 0; point < kPoints * kPoints; ++point) {
    const double x = (point % kPoints + 0.5) / kPoints;
    const double y = (point / kPoints + 0.5) / kPoints;
    const Rgb first = a.At(x, y);
    const Rgb second = b.At(mirrorX ? 1 - x : x, mirrorY ? 1 - y : y);
    sum += std::abs(first.red - second.red) + std::abs(first.green - second.green) +
           std::abs(first.blue - second.blue);
  }
  return sum / (3 * kPoints * kPoints);
}

/// Whether two pictures of the same shape have the same orientation: if mirrored or rotated, they
/// would differ far more than different cameras and encoders do.
bool HaveSameOrientation(const DecodedImage& a, const DecodedImage& b) {
  const double difference = MeanDifference(a, b, false, false);
  return 2 * difference < MeanDifference(a, b, true, false) &&
         2 * difference < MeanDifference(a, b, false, true) &&
         2 * difference < MeanDifference(a, b, true, true);
}

}  // namespace

TEST_F(ThumbOrientation, UprightWithoutDaemon) {
  ExpectMade(true);
  ExpectNothingLeftToMake();
}

/// Index versions up to 0 leave the rotation to the converter.
class ThumbOrientationByIndex : public ThumbOrientation,
                                public ::testing::WithParamInterface<int> {};

TEST_P(ThumbOrientationByIndex, IsUprightOrAsStored) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(GetParam());
  ExpectMade(GetParam() == 0);
}

INSTANTIATE_TEST_SUITE_P(Versions, ThumbOrientationByIndex, ::testing::Values(0, 1, 7));

// A camera photo stored in all orientations always produces the same picture.
TEST_F(ThumbOrientation, CameraPhotosOfAllOrientationsGiveOnePicture) {
  const std::string folder = SharedMediaDirectory();
  std::vector<Strings> sets(1);
  sets[0] = {MakeJpeg(InPhotos("upright.jpg"), RecipeOf(kWidth, kHeight)), Photo(1)};
  for (const char* series : {"landscape_", "portrait_"}) {
    Strings set;
    for (const std::string& name : ListDirectory(folder.empty() ? kPhotos : folder)) {
      if (name.compare(0, std::string(series).size(), series) == 0) {
        CopyFile(folder + "/" + name, InPhotos(name));
        set.push_back(InPhotos(name));
      }
    }
    sets.push_back(set);
  }
  Make();
  Make();
  for (const Strings& set : sets) {
    for (const std::string& photo : set) {
      for (const Kind& kind : kinds_) {
        SCOPED_TRACE(photo + " " + kind.name);
        const auto thumb = DecodeJpeg(ThumbOf(photo, kind));
        const auto first = DecodeJpeg(ThumbOf(set.front(), kind));
        ASSERT_TRUE(thumb && first);
        EXPECT_EQ(thumb->Width(), first->Width());
        EXPECT_EQ(thumb->Height(), first->Height());
        EXPECT_TRUE(HaveSameOrientation(*thumb, *first));
      }
    }
  }
}

}  // namespace vela_test::real
