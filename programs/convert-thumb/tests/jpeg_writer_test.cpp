// Encoded pictures, decoded again.

#include "encoding/jpeg_writer.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdio>
#include <memory>

#include "decoding/jpeg_reader.h"

using namespace vela;

namespace {

constexpr size_t kMemoryLimit = size_t{1} << 26;
constexpr int kWidth = 48;
constexpr int kHeight = 64;

struct CloseFile {
  void operator()(std::FILE* file) const { std::fclose(file); }
};

using Colour = std::array<int, 3>;

/// `top` and `bottom` fill a half each; 0 to 255.
Picture TwoHalves(const Colour& top, const Colour& bottom) {
  Picture picture(kWidth, kHeight, 3);
  for (int y = 0; y < kHeight; ++y) {
    const Colour& colour = y < kHeight / 2 ? top : bottom;
    for (size_t i = 0; i < picture.RowSize(); ++i) {
      picture.Row(y)[i] = static_cast<uint16_t>(colour[i % 3] * kJpegStep);
    }
  }
  return picture;
}

/// A picture encoded to a file.
class Encoded {
 public:
  explicit Encoded(const Picture& picture, const PhotoTraits& traits = PhotoTraits(),
                   int quality = 90)
      : file_(std::tmpfile()) {
    const EncodedJpeg jpeg = EncodeJpeg(picture, traits, quality, false);
    EXPECT_TRUE(jpeg.IsComplete());
    EXPECT_EQ(jpeg.error, "");
    EXPECT_EQ(std::fwrite(jpeg.bytes.get(), 1, jpeg.size, file_.get()), jpeg.size);
    std::rewind(file_.get());
    reader_ = std::make_unique<JpegReader>(fileno(file_.get()), kMemoryLimit);
    EXPECT_TRUE(reader_->ReadHeader());
    EXPECT_TRUE(reader_->Start({kWidth, kHeight}));
    rows_.resize(static_cast<size_t>(kWidth * kHeight * Channels()));
    for (int y = 0; y < kHeight; ++y) {
      EXPECT_TRUE(reader_->ReadRow(Pixel(0, y)));
    }
  }

  int Channels() const { return reader_->Channels(); }
  const PhotoTraits& Traits() const { return reader_->Traits(); }
  uint8_t* Pixel(int x, int y) { return rows_.data() + (y * kWidth + x) * Channels(); }

 private:
  std::unique_ptr<std::FILE, CloseFile> file_;
  std::unique_ptr<JpegReader> reader_;
  std::vector<uint8_t> rows_;
};

TEST(JpegEncoding, StoresAPictureWithoutColourAsGrey) {
  Encoded encoded(TwoHalves({60, 60, 60}, {200, 200, 200}));
  ASSERT_EQ(encoded.Channels(), 1);
  EXPECT_NEAR(encoded.Pixel(20, 10)[0], 60, 2);
  EXPECT_NEAR(encoded.Pixel(20, 50)[0], 200, 2);
}

TEST(JpegEncoding, KeepsTheGreyRowsAboveTheFirstColour) {
  const Colour orange = {220, 130, 40};
  Encoded encoded(TwoHalves({60, 60, 60}, orange));
  ASSERT_EQ(encoded.Channels(), 3);
  for (size_t i = 0; i < 3; ++i) {
    EXPECT_NEAR(encoded.Pixel(20, 10)[i], 60, 3);
    EXPECT_NEAR(encoded.Pixel(20, 50)[i], orange[i], 3);
  }
}

PhotoTraits ColourSampled(int brightness, int colour) {
  PhotoTraits traits;
  traits.colour = true;
  traits.sampling = {JpegSampling{brightness, brightness}, {colour, colour}, {colour, colour}};
  return traits;
}

TEST(JpegEncoding, KeepsThePhotosSampling) {
  Encoded encoded(TwoHalves({60, 80, 60}, {200, 20, 200}), ColourSampled(2, 1));
  EXPECT_EQ(encoded.Traits().sampling[0].horizontal, 2);
  EXPECT_EQ(encoded.Traits().sampling[1].horizontal, 1);
}

TEST(JpegEncoding, IgnoresUnsupportedSampling) {
  // 16, 4 and 4 blocks are more than one unit may have.
  const Picture picture = TwoHalves({60, 80, 60}, {200, 20, 200});
  Encoded fine(picture, ColourSampled(4, 2), 90);
  EXPECT_EQ(fine.Traits().sampling[0].horizontal, 1);
  Encoded coarse(picture, ColourSampled(4, 2), 80);
  EXPECT_EQ(coarse.Traits().sampling[0].horizontal, 2);
  EXPECT_EQ(coarse.Traits().sampling[1].horizontal, 1);
}

TEST(JpegEncoding, ReportsWhyItFails) {
  const EncodedJpeg jpeg = EncodeJpeg(Picture(65501, 1, 3), PhotoTraits(), 80, false);
  EXPECT_FALSE(jpeg.IsComplete());
  EXPECT_NE(jpeg.error.find("65500"), std::string::npos) << jpeg.error;
}

TEST(JpegEncoding, DetectsTheFaintestColour) {
  Picture picture = TwoHalves({60, 60, 60}, {60, 60, 60});
  picture.Row(kHeight - 1)[0] += 1;
  EXPECT_EQ(Encoded(picture).Channels(), 3);
}

}  // namespace
