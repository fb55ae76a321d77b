#include "support/raw_photos.h"

#include <tiffio.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <memory>
#include <vector>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/quadrants.h"

namespace vela_test {

namespace {

struct TiffCloser {
  void operator()(TIFF* tiff) const { TIFFClose(tiff); }
};
using Tiff = std::unique_ptr<TIFF, TiffCloser>;

/// The colours of the filter over each square of two by two sensor cells: red, green, green, blue.
constexpr std::array<uint8_t, 4> kFilter = {0, 1, 1, 2};
constexpr float kBrightest = 65535;

void Must(bool done, const std::string& what) {
  if (!done) {
    EnvironmentFailure("cannot make a raw photo: " + what);
  }
}

/// The picture as the cells of a sensor record it: linear brightness, each cell in the one colour
/// of its filter.
std::vector<uint16_t> SensorCells(int width, int height) {
  const std::string pixels = QuadrantPixels(width, height);
  std::vector<uint16_t> cells;
  cells.reserve(pixels.size() / 3);
  for (size_t i = 0; i < pixels.size() / 3; ++i) {
    const size_t x = i % static_cast<size_t>(width);
    const size_t y = i / static_cast<size_t>(width);
    const uint8_t colour = kFilter[y % 2 * 2 + x % 2];
    const float encoded = static_cast<float>(static_cast<uint8_t>(pixels[i * 3 + colour])) / 255;
    cells.push_back(static_cast<uint16_t>(std::pow(encoded, 2.2F) * kBrightest));
  }
  return cells;
}

std::string RotationPacket(int degrees) {
  return "<x:xmpmeta xmlns:x=\"adobe:ns:meta/\"><rdf:RDF "
         "xmlns:rdf=\"http://www.w3.org/1999/02/22-rdf-syntax-ns#\"><rdf:Description "
         "rdf:about=\"\" xmlns:camera=\"http://example.org/camera/\" camera:Rotation=\"" +
         std::to_string(degrees) + "\"/></rdf:RDF></x:xmpmeta>";
}

void SetSize(TIFF* tiff, int width, int height) {
  TIFFSetField(tiff, TIFFTAG_IMAGEWIDTH, width);
  TIFFSetField(tiff, TIFFTAG_IMAGELENGTH, height);
  TIFFSetField(tiff, TIFFTAG_ROWSPERSTRIP, height);
  TIFFSetField(tiff, TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG);
}

/// Writes the camera tags of a digital negative, for a camera with the colours of the picture.
void SetCamera(TIFF* tiff, const RawRecipe& recipe) {
  constexpr std::array<uint8_t, 4> kVersion = {1, 4, 0, 0};
  constexpr std::array<float, 3> kNeutral = {1, 1, 1};
  TIFFSetField(tiff, TIFFTAG_DNGVERSION, kVersion.data());
  TIFFSetField(tiff, TIFFTAG_DNGBACKWARDVERSION, kVersion.data());
  TIFFSetField(tiff, TIFFTAG_MAKE, "Maker");
  TIFFSetField(tiff, TIFFTAG_MODEL, "Model");
  TIFFSetField(tiff, TIFFTAG_UNIQUECAMERAMODEL, "Maker Model");
  TIFFSetField(tiff, TIFFTAG_ASSHOTNEUTRAL, 3, kNeutral.data());
  if (recipe.orientation > 0) {
    TIFFSetField(tiff, TIFFTAG_ORIENTATION, recipe.orientation);
  }
  if (recipe.rotation) {
    const std::string packet = RotationPacket(*recipe.rotation);
    TIFFSetField(tiff, TIFFTAG_XMLPACKET, static_cast<uint32_t>(packet.size()), packet.data());
  }
}

void SetFilter(TIFF* tiff) {
  constexpr std::array<uint16_t, 2> kRepeat = {2, 2};
  constexpr uint32_t kWhite = 65535;
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_CFA);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_NONE);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, 1);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, 16);
  TIFFSetField(tiff, TIFFTAG_CFAREPEATPATTERNDIM, kRepeat.data());
  TIFFSetField(tiff, TIFFTAG_CFAPATTERN, static_cast<uint16_t>(kFilter.size()), kFilter.data());
  TIFFSetField(tiff, TIFFTAG_WHITELEVEL, 1, &kWhite);
}

void WriteSensor(TIFF* tiff, const RawRecipe& recipe) {
  TIFFSetField(tiff, TIFFTAG_SUBFILETYPE, 0);
  SetSize(tiff, recipe.width, recipe.height);
  SetFilter(tiff);
  std::vector<uint16_t> cells = SensorCells(recipe.width, recipe.height);
  const auto bytes = static_cast<tmsize_t>(cells.size() * sizeof cells[0]);
  Must(TIFFWriteEncodedStrip(tiff, 0, cells.data(), bytes) == bytes, "the sensor's picture");
}

std::string PreviewBytes(const std::string& path, const RawRecipe& recipe) {
  const std::string file = path + ".preview";
  MakeJpeg(file, *recipe.preview);
  const std::string bytes = ReadFile(file);
  RemoveTree(file);
  return bytes.substr(0, recipe.previewBytes);
}

void WritePreview(TIFF* tiff, const RawRecipe& recipe, std::string bytes) {
  TIFFSetField(tiff, TIFFTAG_SUBFILETYPE, FILETYPE_REDUCEDIMAGE);
  SetSize(tiff, recipe.preview->width, recipe.preview->height);
  TIFFSetField(tiff, TIFFTAG_COMPRESSION, COMPRESSION_JPEG);
  TIFFSetField(tiff, TIFFTAG_PHOTOMETRIC, PHOTOMETRIC_YCBCR);
  TIFFSetField(tiff, TIFFTAG_SAMPLESPERPIXEL, 3);
  TIFFSetField(tiff, TIFFTAG_BITSPERSAMPLE, 8);
  const auto size = static_cast<tmsize_t>(bytes.size());
  Must(TIFFWriteRawStrip(tiff, 0, bytes.data(), size) == size, "its preview");
}

}  // namespace

std::string MakeRawPhoto(const std::string& path, const RawRecipe& recipe) {
  MakeDirectories(path.substr(0, path.rfind('/')));
  const std::string preview = recipe.preview ? PreviewBytes(path, recipe) : std::string();
  const Tiff tiff(TIFFOpen(path.c_str(), "w"));
  Must(tiff != nullptr, path);
  SetCamera(tiff.get(), recipe);
  if (recipe.preview) {
    constexpr std::array<uint64_t, 1> kFilledInLater = {0};
    TIFFSetField(tiff.get(), TIFFTAG_SUBIFD, 1, kFilledInLater.data());
  }
  WriteSensor(tiff.get(), recipe);
  Must(TIFFWriteDirectory(tiff.get()) == 1, path);
  if (recipe.preview) {
    WritePreview(tiff.get(), recipe, preview);
    Must(TIFFWriteDirectory(tiff.get()) == 1, path);
  }
  return path;
}

}  // namespace vela_test
