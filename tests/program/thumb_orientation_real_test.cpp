// Which way up real thumbnails are.
#include <cmath>

#include "program/real_program_test.h"
#include "support/build_paths.h"
#include "support/daemon_peer.h"
#include "support/images.h"

namespace vela_test::real {

namespace {

constexpr int kWidth = 240;
constexpr int kHeight = 160;

class ThumbOrientation : public RealProgramTest {
 protected:
  void SetUp() override {
    RealProgramTest::SetUp();
    for (int orientation = 1; orientation <= 8; ++orientation) {
      JpegRecipe recipe;
      recipe.width = kWidth;
      recipe.height = kHeight;
      recipe.orientation = orientation;
      MakeJpeg(Photo(orientation), recipe);
    }
  }

  static std::string Photo(int orientation) {
    return InPhotos("orientation_" + std::to_string(orientation) + ".jpg");
  }

  /// The quadrants and the shape; a tag that is left would turn the picture a second time.
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

  void ExpectUpright() const {
    for (int orientation = 1; orientation <= 8; ++orientation) {
      for (const Kind& kind : kinds_) {
        ExpectThumb(orientation, kind, LettersAfterOrientation(orientation), orientation >= 5);
      }
    }
  }

  void ExpectAsStored() const {
    for (int orientation = 1; orientation <= 8; ++orientation) {
      for (const Kind& kind : kinds_) {
        ExpectThumb(orientation, kind, "RGBY", false);
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

/// Whether two pictures of the same shape are the same way up: mirrored or turned they would differ
/// far more than by what cameras and encoders do to them.
bool IsSameWayUp(const DecodedImage& a, const DecodedImage& b) {
  const double difference = MeanDifference(a, b, false, false);
  return 2 * difference < MeanDifference(a, b, true, false) &&
         2 * difference < MeanDifference(a, b, false, true) &&
         2 * difference < MeanDifference(a, b, true, true);
}

}  // namespace

TEST_F(ThumbOrientation, UprightWithoutDaemon) {
  Make();
  Make();
  ExpectUpright();
  ExpectNothingLeftToMake();
}

TEST_F(ThumbOrientation, UprightWithIndexOfVersionZero) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(0);
  Make();
  Make();
  ExpectUpright();
}

TEST_F(ThumbOrientation, AsStoredWithIndexOfVersionOne) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(1);
  Make();
  Make();
  ExpectAsStored();
}

TEST_F(ThumbOrientation, AsStoredWithIndexOfALaterVersion) {
  DaemonPeer daemon;
  daemon.SetIndexVersion(7);
  Make();
  Make();
  ExpectAsStored();
}

// One photo of a camera, stored in all the ways that its owner could hold it, gives one picture.
TEST_F(ThumbOrientation, CameraPhotosOfAllOrientationsGiveOnePicture) {
  const std::string folder = SharedMediaDirectory();
  std::vector<std::vector<std::string>> sets(1);
  JpegRecipe upright;
  upright.width = kWidth;
  upright.height = kHeight;
  sets[0] = {MakeJpeg(InPhotos("upright.jpg"), upright), Photo(1)};
  for (const char* series : {"landscape_", "portrait_"}) {
    std::vector<std::string> set;
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
  for (const std::vector<std::string>& set : sets) {
    for (const std::string& photo : set) {
      for (const Kind& kind : kinds_) {
        SCOPED_TRACE(photo + " " + kind.name);
        const auto thumb = DecodeJpeg(ThumbOf(photo, kind));
        const auto first = DecodeJpeg(ThumbOf(set.front(), kind));
        ASSERT_TRUE(thumb && first);
        EXPECT_EQ(thumb->Width(), first->Width());
        EXPECT_EQ(thumb->Height(), first->Height());
        EXPECT_TRUE(IsSameWayUp(*thumb, *first));
      }
    }
  }
}

}  // namespace vela_test::real
