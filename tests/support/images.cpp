#include "support/images.h"

#include <lcms2.h>

#include <exiv2/exiv2.hpp>
#include <vector>

#include "support/colour_profile.h"
#include "support/environment_failure.h"
#include "support/files.h"
#include "support/program.h"
#include "support/quadrants.h"
#include "support/sandbox.h"

namespace vela_test {

namespace {

bool HasMetadata(const JpegRecipe& recipe) {
  return recipe.exif || recipe.xmp || recipe.iptc || recipe.orientation > 0 ||
         !recipe.comment.empty();
}

void AddMetadata(const std::string& path, const JpegRecipe& recipe) {
  auto image = Exiv2::ImageFactory::open(path);
  image->readMetadata();
  if (recipe.exif || recipe.orientation > 0) {
    image->exifData()["Exif.Image.Make"] = "Maker";
    image->exifData()["Exif.Photo.DateTimeOriginal"] = "2020:02:03 04:05:06";
  }
  if (recipe.orientation > 0) {
    image->exifData()["Exif.Image.Orientation"] = static_cast<uint16_t>(recipe.orientation);
  }
  if (recipe.xmp) {
    image->xmpData()["Xmp.dc.title"] = "lang=x-default Title";
  }
  if (recipe.iptc) {
    image->iptcData()["Iptc.Application2.Caption"] = "Caption";
  }
  image->setComment(recipe.comment);
  image->writeMetadata();
}

std::string PpmOf(int width, int height) {
  return "P6\n" + std::to_string(width) + " " + std::to_string(height) + "\n255\n" +
         QuadrantPixels(width, height);
}

/// Runs the machine's ImageMagick with the upright picture as its standard input.
void Convert(const std::vector<std::string>& arguments, int width, int height) {
  ProgramOptions options;
  options.input = PpmOf(width, height);
  const ProgramResult result = RunProgram(HostPath("/usr/bin/convert"), arguments, options);
  if (result.exitCode != 0) {
    EnvironmentFailure("cannot make " + arguments.back() + ": " + result.err);
  }
}

std::string SizeText(int width, int height) {
  return std::to_string(width) + "x" + std::to_string(height);
}

/// The upright picture, then plain grey ones.
void MakeSequence(const std::string& path, int count, int width, int height) {
  std::vector<std::string> arguments = {"ppm:-", "-size", SizeText(width, height)};
  for (int i = 1; i < count; ++i) {
    const int brightness = 45 + i % 10;  // percent; neighbours differ, so that no frame is merged
    arguments.push_back("xc:gray(" + std::to_string(brightness) + "%)");
  }
  arguments.push_back(path);
  Convert(arguments, width, height);
}

}  // namespace

std::string MakeJpeg(const std::string& path, const JpegRecipe& recipe) {
  WriteFile(path, EncodeJpeg(recipe));
  if (HasMetadata(recipe)) {
    try {
      AddMetadata(path, recipe);
    } catch (const std::exception& error) {
      EnvironmentFailure("cannot add metadata to " + path + ": " + error.what());
    }
  }
  return path;
}

std::string MakeTruncatedJpeg(const std::string& path, int width, int height) {
  JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  const std::string whole = EncodeJpeg(recipe);
  WriteFile(path, whole.substr(0, whole.size() * 6 / 10));
  return path;
}

std::string MakeTransparentPng(const std::string& path, int width, int height) {
  const std::string half = std::to_string(width / 2);
  Convert(
      {"ppm:-", "-alpha", "set", "-region", SizeText(width - width / 2, height) + "+" + half + "+0",
       "-channel", "A", "-evaluate", "set", "0", "+channel", "+region", "png32:" + path},
      width, height);
  return path;
}

std::string MakeAnimatedGif(const std::string& path, int frames, int width, int height) {
  MakeSequence(path, frames, width, height);
  return path;
}

std::string MakeMultiPageTiff(const std::string& path, int pages, int width, int height) {
  MakeSequence(path, pages, width, height);
  return path;
}

std::string MakeImage(const std::string& path, int width, int height) {
  Convert({"ppm:-", path}, width, height);
  return path;
}

std::string MakePpm(const std::string& path, int width, int height) {
  WriteFile(path, PpmOf(width, height));
  return path;
}

std::string SrgbProfile() {
  static const std::string profile = ProfileBytes(cmsCreate_sRGBProfile());
  return profile;
}

}  // namespace vela_test
