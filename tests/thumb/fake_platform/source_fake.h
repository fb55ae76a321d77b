// Replaces the preparation of a photo: the decoding of camera raw photos and the detection of a
// user's rotation. For test programs with a single source file.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"
#include "source/raw_image.h"
#include "source/rotation_check.h"

namespace vela_test {

/// Determines the results while the object exists; without one no raw photo can be decoded and no
/// photo is turned.
class SourceFake {
 public:
  /// One call: its two paths and the number of profiles in its job.
  struct Question {
    std::string path;
    std::string metadataDir;
    size_t profiles;
  };

  SourceFake() { Current() = this; }
  ~SourceFake() { Current() = nullptr; }
  SourceFake(const SourceFake&) = delete;
  SourceFake& operator=(const SourceFake&) = delete;

  /// Makes the decoded copy and returns its path.
  std::function<std::string(const std::string& metadataDir)> decode;
  /// The turn of every photo, degrees.
  int rotation = 0;

  std::vector<Question> decodings;
  std::vector<Question> rotations;

  static SourceFake*& Current() {
    static SourceFake* current = nullptr;
    return current;
  }
};

}  // namespace vela_test

int GetImageResolution(const std::string& path, uint32_t& width, uint32_t& height) {
  return VELAIndexImgResGet(path.c_str(), &width, &height) == 0 ? 1 : 0;
}

std::string ConvertRawToJpeg(const DirectoryJob& job, const std::string& rawPath,
                             const std::string& thumbDir) {
  vela_test::SourceFake* source = vela_test::SourceFake::Current();
  if (source == nullptr) {
    return "";
  }
  source->decodings.push_back({rawPath, thumbDir, job.profiles.all.size()});
  return source->decode ? source->decode(thumbDir) : std::string();
}

int DetectThumbRotation(const DirectoryJob& job, const std::string& photoPath,
                        const std::string& thumbDir) {
  vela_test::SourceFake* source = vela_test::SourceFake::Current();
  if (source == nullptr) {
    return 0;
  }
  source->rotations.push_back({photoPath, thumbDir, job.profiles.all.size()});
  return source->rotation;
}
