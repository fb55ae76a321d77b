#include "converter_photos.h"

#include <unistd.h>

#include "converter_commands.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

bool Exists(const std::string& path) {
  return access(path.c_str(), R_OK) == 0;
}

std::string SizeText(const BenchPhoto& photo) {
  return std::to_string(photo.width) + "x" + std::to_string(photo.height);
}

/// Creates detail at every scale and sensor noise.
void MakeBaseline(const BenchPhoto& photo, const std::string& path) {
  TimedRun({kImageMagick, "-seed", "1", "-size", SizeText(photo), "plasma:sienna-steelblue",
            "-attenuate", "0.2", "+noise", "Gaussian", "-sampling-factor", "2x2", "-quality", "92",
            path});
}

}  // namespace

std::vector<BenchPhoto> BaselinePhotos() {
  return {{"3 megapixels", 2048, 1536, "jpg", false},
          {"8 megapixels", 3264, 2448, "jpg", false},
          {"12 megapixels", 4000, 3000, "jpg", false},
          {"24 megapixels", 6000, 4000, "jpg", false},
          {"48 megapixels", 8000, 6000, "jpg", false}};
}

std::vector<BenchPhoto> OtherPhotos() {
  return {{"48 megapixels, progressive JPEG", 8000, 6000, "jpg", true},
          {"12 megapixels, PNG", 4000, 3000, "png", false},
          {"12 megapixels, TIFF", 4000, 3000, "tif", false},
          {"12 megapixels, PPM", 4000, 3000, "ppm", false},
          {"12 megapixels, HEIC", 4000, 3000, "heic", false}};
}

bool IsJpeg(const BenchPhoto& photo) {
  return std::string(photo.extension) == "jpg";
}

std::string MakePhoto(const BenchPhoto& photo, const std::string& directory) {
  const std::string stem = directory + "/" + SizeText(photo);
  const std::string baseline = stem + ".jpg";
  if (!Exists(baseline)) {
    MakeBaseline(photo, baseline);
  }
  const std::string path = stem + (photo.progressive ? "p." : ".") + photo.extension;
  if (!Exists(path)) {
    TimedRun({kImageMagick, baseline, "-interlace", photo.progressive ? "Plane" : "None", path});
  }
  return path;
}

}  // namespace vela_bench
