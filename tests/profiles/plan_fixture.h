// A photo, its metadata directory, the profiles of a run and a recording converter.
#pragma once

#include <sys/stat.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "profiles/photo_thumb_plan.h"
#include "support/files.h"
#include "support/quiet_test.h"
#include "support/stub_tool.h"
#include "support/words.h"

namespace vela_test {

constexpr int64_t kPhotoTime = 1600000000;
constexpr const char* kPhoto = "/tmp/photo/a.jpg";
constexpr const char* kEaDir = "/tmp/photo/@eaDir/a.jpg";

/// The path of a file in the photo's metadata directory.
inline std::string InEaDir(const std::string& name) {
  return std::string(kEaDir) + "/" + name;
}

class PlanTest : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    mask_ = umask(0);  // as in the program
    converter_.emplace(kConverterPath);
    WriteFile(kPhoto, "photo");
    SetFileTime(kPhoto, kPhotoTime);
    MakeDirectories(kEaDir);
  }

  void TearDown() override {
    umask(mask_);
    QuietTest::TearDown();
  }

  StubTool& Converter() { return *converter_; }

  /// Adds a profile; profiles must be added in ascending order of size.
  const ThumbnailProfile& AddProfile(int size, const std::string& filename, int phase = 0,
                                     int quality = 80, const std::string& unsharp = "") {
    profiles_.all.push_back(
        std::make_unique<const ThumbnailProfile>(size, quality, unsharp, filename, phase));
    const ThumbnailProfile* profile = profiles_.all.back().get();
    (phase == 1   ? profiles_.phase1
     : phase == 2 ? profiles_.phase2
                  : profiles_.phase0)
        .push_back(profile);
    return *profile;
  }

  DirectoryJob Job() const { return {"/tmp/photo", profiles_}; }

  int CreateThumbs(int phase = 0, bool autoOrient = false, int rotate = -1) const {
    return CreatePhotoThumbs(Job(), phase, kPhoto, kEaDir, autoOrient, false, rotate);
  }

  /// Makes a file in the metadata directory, dated `seconds` after the photo.
  static void MakeThumb(const std::string& name, const std::string& content = "old thumb",
                        int64_t seconds = 1) {
    WriteFile(InEaDir(name), content);
    SetFileTime(InEaDir(name), kPhotoTime + seconds);
  }

  static std::vector<std::string> EaFiles() { return ListDirectory(kEaDir); }

 private:
  mode_t mask_ = 0;
  std::optional<StubTool> converter_;  // not before the sandbox is reset
  ThumbnailProfileList profiles_;
};

/// The converter's parameters with the random part of temporary names made readable: the six
/// characters become "?", when they are six letters or digits.
inline std::vector<std::string> WithoutRandomNames(std::vector<std::string> parameters) {
  const std::string beginning = "/VELAPHOTO.tmp.";
  for (std::string& parameter : parameters) {
    const size_t at = parameter.find(beginning);
    if (at == std::string::npos) {
      continue;
    }
    const std::string random = parameter.substr(at + beginning.size(), 6);
    if (random.size() == 6 && random != "XXXXXX" &&
        random.find_first_not_of(
            "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789") ==
            std::string::npos) {
      parameter.replace(at + beginning.size(), 6, "?");
    }
  }
  return parameters;
}

/// The parameters of the converter's only call.
inline std::vector<std::string> OnlyCall(const StubTool& converter) {
  const std::vector<StubCall> calls = converter.Calls();
  EXPECT_EQ(calls.size(), 1U);
  return calls.empty() ? std::vector<std::string>()
                       : WithoutRandomNames(calls.front().Parameters());
}

/// The values that follow an option, in order.
inline std::vector<std::string> ValuesOf(const std::vector<std::string>& parameters,
                                         const std::string& option) {
  std::vector<std::string> values;
  for (size_t i = 0; i + 1 < parameters.size(); ++i) {
    if (parameters[i] == option) {
      values.push_back(parameters[i + 1]);
    }
  }
  return values;
}

}  // namespace vela_test
