#include "picture/colour_conversion.h"

#include <utility>

namespace vela {

namespace {

constexpr float kMiddle = 32768;
constexpr float kMiddleStep = 128 * kJpegStep;
constexpr float kRedWeight = 0.299F;
constexpr float kGreenWeight = 0.587F;
constexpr float kBlueWeight = 0.114F;
/// Scale the colour differences to the range of a sample.
constexpr float kBlueScale = 2 * (1 - kBlueWeight);
constexpr float kRedScale = 2 * (1 - kRedWeight);

Picture CmykToRgb(const Picture& cmyk) {
  Picture rgb(cmyk.width, cmyk.height, 3);
  const uint16_t* in = cmyk.samples.data();
  for (size_t i = 0; i < rgb.samples.size(); i += 3) {
    const float black = static_cast<float>(in[3]) / kBrightest;
    for (size_t channel = 0; channel < 3; ++channel) {
      rgb.samples[i + channel] = ToSample(static_cast<float>(in[channel]) * black);
    }
    in += 4;
  }
  return rgb;
}

}  // namespace

void LumaChromaToRgb(uint16_t* samples, size_t pixels) {
  for (size_t i = 0; i < pixels; ++i) {
    uint16_t* const pixel = samples + i * 3;
    const float luma = pixel[0];
    const float blue = luma + kBlueScale * (static_cast<float>(pixel[1]) - kMiddle);
    const float red = luma + kRedScale * (static_cast<float>(pixel[2]) - kMiddle);
    const float green = (luma - kRedWeight * red - kBlueWeight * blue) / kGreenWeight;
    pixel[0] = ToSample(red);
    pixel[1] = ToSample(green);
    pixel[2] = ToSample(blue);
  }
}

void ConvertToRgb(Picture& picture, ColourSpace from) {
  if (from == ColourSpace::kCmyk) {
    picture = CmykToRgb(picture);
  } else if (from == ColourSpace::kLumaChroma) {
    LumaChromaToRgb(picture.samples.data(), picture.samples.size() / 3);
  }
}

void RgbToLumaChroma(float red, float green, float blue, uint16_t* out) {
  const float luma = kRedWeight * red + kGreenWeight * green + kBlueWeight * blue;
  out[0] = ToSample(luma);
  out[1] = ToSample(kMiddleStep + (blue - luma) / kBlueScale);
  out[2] = ToSample(kMiddleStep + (red - luma) / kRedScale);
}

}  // namespace vela
