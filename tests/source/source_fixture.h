// Fixture: a metadata directory and the profiles of a run.
#pragma once

#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>

#include <cerrno>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "header/header_reader.h"
#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"
#include "support/files.h"
#include "support/image_checks.h"
#include "support/images.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/raw_photos.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kRaw = "/tmp/photos/a.dng";
constexpr const char* kThumbDir = "/tmp/photos/@eaDir/a.dng";

/// The path of a file in the metadata directory.
inline std::string InThumbDir(const std::string& name) {
  return std::string(kThumbDir) + "/" + name;
}

/// Makes a JPEG of this size without any metadata but an orientation, if given. Returns `path`.
inline std::string MakePicture(const std::string& path, int width, int height,
                               int orientation = 0) {
  JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  recipe.orientation = orientation;
  return MakeJpeg(path, recipe);
}

/// A raw photo of 240 x 160 pixels with a preview of this size.
inline RawRecipe RawWithPreview(int width, int height) {
  RawRecipe recipe;
  recipe.width = 240;
  recipe.height = 160;
  recipe.preview.emplace();
  recipe.preview->width = width;
  recipe.preview->height = height;
  return recipe;
}

/// Where the full decode and the preview of kRaw are stored.
const std::string kPpm = InThumbDir("RAW_TEMP.ppm");
const std::string kPreview = InThumbDir("VELAPHOTO_THUMB_RAW.jpg");

class SourceTest : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kThumbDir);
  }

  /// Fails if a child was not waited for.
  void TearDown() override {
    vela::EndHeaderReader();
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child was left";
    EXPECT_EQ(errno, ECHILD);
  }

  /// Adds a profile of phase 0; profiles must be added in ascending order of size.
  void AddProfile(int size, const std::string& filename, int quality = 90) {
    profiles_.all.push_back(
        std::make_unique<const ThumbnailProfile>(size, quality, "", filename, 0));
    profiles_.phase0.push_back(profiles_.all.back().get());
  }

  DirectoryJob Job() const { return {"/tmp/photos", profiles_}; }

  static std::vector<std::string> ThumbDirFiles() { return ListDirectory(kThumbDir); }

 private:
  ThumbnailProfileList profiles_;
};

/// The arguments after argument zero of each call.
inline std::vector<std::vector<std::string>> ParametersOf(const std::vector<StubCall>& calls) {
  std::vector<std::vector<std::string>> parameters;
  for (const StubCall& call : calls) {
    parameters.push_back(call.Parameters());
  }
  return parameters;
}

/// Argument lists to compare with ParametersOf.
using ArgumentLists = std::vector<std::vector<std::string>>;

}  // namespace vela_test
