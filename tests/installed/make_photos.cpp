// make_photos DIRECTORY
//
// Makes one photo of each kind that thumbnails are made of.
#include <array>
#include <cstdio>
#include <filesystem>
#include <string>

#include "support/images.h"
#include "support/raw_photos.h"

namespace {

using namespace vela_test;

/// Larger than every thumbnail, so that each has exactly its size.
constexpr int kWidth = 1800;
constexpr int kHeight = 1350;

/// Every extension of raw photos that the index knows, besides dng and nef.
constexpr std::array kOtherRawKinds = {"3fr", "arw", "cr2", "crw", "dcr", "erf", "k25",
                                       "kdc", "mef", "mos", "mrw", "orf", "pef", "ptx",
                                       "raf", "raw", "rw2", "sr2", "srf", "srw", "x3f"};

JpegRecipe Jpeg() {
  JpegRecipe recipe;
  recipe.width = kWidth;
  recipe.height = kHeight;
  return recipe;
}

void MakePhotos(const std::string& folder) {
  JpegRecipe turned = Jpeg();
  turned.orientation = 6;
  JpegRecipe print = Jpeg();
  print.colour = JpegColour::kCmyk;
  RawRecipe raw;
  raw.width = kWidth;
  raw.height = kHeight;
  RawRecipe rawWithPreview = raw;
  rawWithPreview.preview = Jpeg();
  MakeJpeg(folder + "/camera.jpg", Jpeg());
  MakeJpeg(folder + "/turned.JPEG", turned);
  MakeJpeg(folder + "/print.jpe", print);
  MakeTransparentPng(folder + "/drawing.png", kWidth, kHeight);
  MakeAnimatedGif(folder + "/animation.gif", 2, kWidth, kHeight);
  MakeMultiPageTiff(folder + "/scan.tif", 2, kWidth, kHeight);
  for (const char* name : {"scan.tiff", "screen.bmp", "web.webp", "phone.heic", "layers.psd"}) {
    MakeImage(folder + "/" + name, kWidth, kHeight);
  }
  // Of the same container with the other codec.
  MakeImage("avif:" + folder + "/phone.heif", kWidth, kHeight);
  MakeRawPhoto(folder + "/negative.dng", raw);
  MakeRawPhoto(folder + "/negative.NEF", rawWithPreview);
  for (const char* kind : kOtherRawKinds) {
    MakeRawPhoto(folder + "/raw photos/negative." + kind, raw);
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fprintf(stderr, "usage: make_photos DIRECTORY\n");
    return 2;
  }
  std::filesystem::create_directories(argv[1]);
  MakePhotos(argv[1]);
  return 0;
}
