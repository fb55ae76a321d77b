// The processing steps, one at a time, on small pictures.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <numeric>

#include "picture/resize.h"
#include "picture/sample_loops.h"
#include "picture/thumbnail_size.h"
#include "picture/turn.h"
#include "picture/unsharp.h"

using namespace vela;

namespace {

using ::testing::ElementsAre;

/// One row of numbers a row, such as {{1, 2}, {3, 4}}.
Picture GreyPicture(const std::vector<std::vector<uint16_t>>& rows) {
  Picture picture(static_cast<int>(rows.front().size()), static_cast<int>(rows.size()), 1);
  for (size_t y = 0; y < rows.size(); ++y) {
    std::copy(rows[y].begin(), rows[y].end(), picture.Row(static_cast<int>(y)));
  }
  return picture;
}

void ExpectSize(PictureSize size, int width, int height) {
  EXPECT_EQ(size.width, width);
  EXPECT_EQ(size.height, height);
}

TEST(ThumbnailSizes, FitTheBox) {
  ExpectSize(ThumbnailSize({4000, 3000}, {1280, 1280, false}), 1280, 960);
  ExpectSize(ThumbnailSize({3000, 4000}, {1280, 1280, false}), 960, 1280);
  ExpectSize(ThumbnailSize({4000, 3000}, {100, 1000, false}), 100, 75);
}

TEST(ThumbnailSizes, FillTheBox) {
  ExpectSize(ThumbnailSize({4000, 3000}, {120, 120, true}), 160, 120);
  ExpectSize(ThumbnailSize({3000, 4000}, {120, 120, true}), 120, 160);
}

TEST(ThumbnailSizes, NeverGrowAndAreNeverEmpty) {
  ExpectSize(ThumbnailSize({100, 50}, {1280, 1280, false}), 100, 50);
  ExpectSize(ThumbnailSize({100, 50}, {1280, 1280, true}), 100, 50);
  ExpectSize(ThumbnailSize({30000, 10}, {1280, 1280, false}), 1280, 1);
  ExpectSize(ThumbnailSize({1, 1}, {65535, 65535, true}), 1, 1);
}

TEST(Sharpening, ReportsItsMemory) {
  UnsharpMask mask;
  mask.radius = 70;
  // 141 source rows and as many blurred ones, of 3000 floats.
  const size_t rows = size_t{2} * 141 * 3000 * sizeof(float);
  EXPECT_GE(RowSharpener::Memory({1000, 10}, 3, mask), rows);
  EXPECT_LE(RowSharpener::Memory({1000, 10}, 3, mask), rows + rows / 10);
}

TEST(Contributions, SumUpToOne) {
  for (const FilterKind kind : {FilterKind::kLanczos, FilterKind::kMitchell}) {
    for (const int grid : {0, 50}) {
      for (const Contribution& contribution : MakeContributions(97, 10, grid, kind)) {
        EXPECT_NEAR(std::accumulate(contribution.weights.begin(), contribution.weights.end(), 0.0),
                    1.0, 1e-5);
        EXPECT_GE(contribution.first, 0);
        EXPECT_LE(contribution.End(), 97);
      }
    }
  }
}

TEST(Resizing, KeepsAPlainColour) {
  Picture picture(90, 70, 3);
  for (size_t i = 0; i < picture.samples.size(); ++i) {
    picture.samples[i] = static_cast<uint16_t>(10000 * (1 + i % 3));
  }
  PictureRows rows(picture);
  const auto scaled = Resize(rows, {{31, 17}, FilterKind::kLanczos, false});
  ASSERT_TRUE(scaled);
  ASSERT_EQ(scaled->samples.size(), 31U * 17 * 3);
  for (size_t i = 0; i < scaled->samples.size(); ++i) {
    EXPECT_NEAR(scaled->samples[i], 10000 * (1 + static_cast<int>(i % 3)), 1);
  }
}

TEST(Resizing, CommutesWithMirroring) {
  Picture picture(41, 23, 1);
  for (size_t i = 0; i < picture.samples.size(); ++i) {
    picture.samples[i] = static_cast<uint16_t>(i * 2654435761U >> 8);
  }
  Picture mirrored = picture;
  ApplyOrientation(mirrored, 3);
  PictureRows rows(picture);
  PictureRows mirroredRows(mirrored);
  const ResizePlan plan{{13, 7}, FilterKind::kMitchell, false, false};
  const auto scaled = Resize(rows, plan);
  auto scaledMirrored = Resize(mirroredRows, plan);
  ASSERT_TRUE(scaled && scaledMirrored);
  ApplyOrientation(*scaledMirrored, 3);
  for (size_t i = 0; i < scaled->samples.size(); ++i) {
    EXPECT_NEAR(scaled->samples[i], scaledMirrored->samples[i], 2);
  }
}

TEST(Resizing, PresamplesLargeReductions) {
  EXPECT_TRUE(IsPresampled({4000, 3000}, {1000, 750}));
  EXPECT_FALSE(IsPresampled({4000, 3000}, {1280, 960}));
  EXPECT_FALSE(IsPresampled({4000, 3000}, {25, 19}));
}

/// The picture's samples of one channel, as a picture of their own.
Picture ChannelOf(const Picture& picture, int channel) {
  Picture grey(picture.width, picture.height, 1);
  const size_t channels = static_cast<size_t>(picture.channels);
  for (size_t i = 0; i < grey.samples.size(); ++i) {
    grey.samples[i] = picture.samples[i * channels + static_cast<size_t>(channel)];
  }
  return grey;
}

Picture NoisyPicture(int width, int height, int channels) {
  Picture picture(width, height, channels);
  for (size_t i = 0; i < picture.samples.size(); ++i) {
    picture.samples[i] = static_cast<uint16_t>(i * 2654435761U >> 8);
  }
  return picture;
}

Picture Scaled(const Picture& picture, const ResizePlan& plan) {
  PictureRows rows(picture);
  return Resize(rows, plan).value_or(Picture());
}

void ExpectNear(const Picture& picture, const Picture& expected, int tolerance) {
  ASSERT_EQ(picture.width, expected.width);
  ASSERT_EQ(picture.height, expected.height);
  ASSERT_EQ(picture.samples.size(), expected.samples.size());
  for (size_t i = 0; i < expected.samples.size(); ++i) {
    ASSERT_NEAR(picture.samples[i], expected.samples[i], tolerance) << i;
  }
}

/// Number of samples per pixel.
class Channels : public ::testing::TestWithParam<int> {};

TEST_P(Channels, AreScaledAlike) {
  const Picture picture = NoisyPicture(101, 67, GetParam());
  for (const FilterKind filter : {FilterKind::kLanczos, FilterKind::kMitchell}) {
    for (const PictureSize size : {PictureSize{29, 19}, {100, 66}, {1, 67}, {101, 1}}) {
      const ResizePlan plan{size, filter, false, false};
      const Picture scaled = Scaled(picture, plan);
      for (int channel = 0; channel < GetParam(); ++channel) {
        ExpectNear(ChannelOf(scaled, channel), Scaled(ChannelOf(picture, channel), plan), 1);
      }
    }
  }
}

TEST_P(Channels, AreSharpenedAlike) {
  const Picture picture = NoisyPicture(37, 23, GetParam());
  const UnsharpMask mask{0, 0.8, 0.5, 0.01};
  Picture sharpened = picture;
  Sharpen(sharpened, mask);
  EXPECT_NE(sharpened.samples, picture.samples);
  for (int channel = 0; channel < GetParam(); ++channel) {
    Picture expected = ChannelOf(picture, channel);
    Sharpen(expected, mask);
    ExpectNear(ChannelOf(sharpened, channel), expected, 1);
  }
}

TEST_P(Channels, AreTurnedAlike) {
  const Picture picture = NoisyPicture(7, 5, GetParam());
  for (int orientation = 1; orientation <= 8; ++orientation) {
    Picture upright = picture;
    ApplyOrientation(upright, orientation);
    for (int channel = 0; channel < GetParam(); ++channel) {
      Picture expected = ChannelOf(picture, channel);
      ApplyOrientation(expected, orientation);
      ExpectNear(ChannelOf(upright, channel), expected, 0);
    }
  }
}

INSTANTIATE_TEST_SUITE_P(OneToFour, Channels, ::testing::Values(1, 3, 4));

/// Rows that end too early.
class BrokenRows final : public RowSource {
 public:
  int Width() const override { return 10; }
  int Height() const override { return 10; }
  int Channels() const override { return 1; }
  bool ReadRow(float* row) override {
    std::fill(row, row + 10, 0.0F);
    return ++read_ < 6;
  }

 private:
  int read_ = 0;
};

TEST(Resizing, FailsWhenARowCannotBeRead) {
  for (const int side : {10, 5}) {
    BrokenRows rows;
    EXPECT_FALSE(Resize(rows, {{side, side}, FilterKind::kLanczos, false}));
  }
}

TEST(Sharpening, LeavesAPlainColourAlone) {
  Picture picture(20, 10, 3);
  std::fill(picture.samples.begin(), picture.samples.end(), uint16_t{30000});
  Sharpen(picture, {0, 2, 1, 0});
  for (const uint16_t sample : picture.samples) {
    EXPECT_NEAR(sample, 30000, 1);
  }
}

TEST(Sharpening, LeavesSmallDifferencesAlone) {
  Picture picture = GreyPicture({{30000, 30100, 30000}, {30100, 30000, 30100}});
  const Picture before = picture;
  Sharpen(picture, {0, 1, 5, 0.01});
  EXPECT_EQ(picture.samples, before.samples);
  Sharpen(picture, {0, 1, 5, 0});
  EXPECT_NE(picture.samples, before.samples);
}

TEST(Sharpening, SteepensEdges) {
  Picture picture = GreyPicture({{20000, 20000, 20000, 40000, 40000, 40000}});
  Sharpen(picture, {0, 1, 1, 0});
  EXPECT_LT(picture.Row(0)[2], 20000);
  EXPECT_GT(picture.Row(0)[3], 40000);
}

TEST(Turning, MovesEverySample) {
  const Picture picture = GreyPicture({{1, 2, 3}, {4, 5, 6}});
  const auto turned = [&](int quarterTurns) {
    Picture copy = picture;
    Turn(copy, quarterTurns);
    return copy;
  };
  EXPECT_THAT(turned(0).samples, ElementsAre(1, 2, 3, 4, 5, 6));
  EXPECT_THAT(turned(1).samples, ElementsAre(4, 1, 5, 2, 6, 3));
  EXPECT_EQ(turned(1).width, 2);
  EXPECT_THAT(turned(2).samples, ElementsAre(6, 5, 4, 3, 2, 1));
  EXPECT_THAT(turned(3).samples, ElementsAre(3, 6, 2, 5, 1, 4));
}

TEST(Turning, KeepsTheSamplesOfAPixelTogether) {
  Picture picture(2, 1, 3);
  picture.samples = {1, 2, 3, 4, 5, 6};
  ApplyOrientation(picture, 2);
  EXPECT_THAT(picture.samples, ElementsAre(4, 5, 6, 1, 2, 3));
  Turn(picture, 1);
  EXPECT_THAT(picture.samples, ElementsAre(4, 5, 6, 1, 2, 3));
  EXPECT_EQ(picture.height, 2);
}

TEST(Loops, RoundToTheNearestJpegSample) {
  std::vector<float> samples(65536);
  std::iota(samples.begin(), samples.end(), 0.0F);
  std::vector<uint8_t> rounded(samples.size());
  RoundRow(samples.data(), rounded.data(), samples.size());
  for (int i = 0; i < 65536; ++i) {
    ASSERT_EQ(rounded[static_cast<size_t>(i)], (i + 128) / 257) << i;
  }
}

TEST(Loops, ClampSums) {
  std::vector<float> samples(PaddedSize(5));
  const std::vector<float> values = {-5, 0, 100, 65535, 70000};
  std::copy(values.begin(), values.end(), samples.begin());
  const WeightedRow row{samples.data(), 1};
  std::vector<float> cut(samples.size());
  SumRows(&row, 1, cut.data(), cut.size());
  cut.resize(values.size());
  EXPECT_THAT(cut, ElementsAre(0, 0, 100, 65535, 65535));
}

TEST(Loops, InterleaveRowsAndBack) {
  const size_t stride = PaddedSize(40);
  std::vector<float> rows(stride * kBlockRows);
  std::iota(rows.begin(), rows.end(), 0.0F);
  std::vector<float> lanes(rows.size());
  RowsToLanes(rows.data(), stride, lanes.data());
  for (size_t i = 0; i < rows.size(); ++i) {
    ASSERT_EQ(lanes[i % stride * kBlockRows + i / stride], rows[i]) << i;
  }
  std::vector<float> back(rows.size());
  LanesToRows(lanes.data(), stride, back.data());
  EXPECT_EQ(back, rows);
}

}  // namespace
