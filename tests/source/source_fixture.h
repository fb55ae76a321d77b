// A raw photo, its metadata directory, the profiles of a run and what the log says of them.
#pragma once

#include <gmock/gmock.h>
#include <sys/wait.h>

#include <cerrno>
#include <memory>
#include <string>
#include <vector>

#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"
#include "support/files.h"
#include "support/images.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {

constexpr const char* kRaw = "/tmp/photos/a.dng";
constexpr const char* kThumbDir = "/tmp/photos/@eaDir/a.dng";

/// The path of a file in the metadata directory.
inline std::string InThumbDir(const std::string& name) {
  return std::string(kThumbDir) + "/" + name;
}

/// Makes a JPEG of this size without any metadata. Returns `path`.
inline std::string MakePicture(const std::string& path, int width, int height) {
  JpegRecipe recipe;
  recipe.width = width;
  recipe.height = height;
  return MakeJpeg(path, recipe);
}

class SourceTest : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kThumbDir);
  }

  /// A child left waiting would stay until this program ends.
  void TearDown() override {
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child was left";
    EXPECT_EQ(errno, ECHILD);
  }

  /// Adds a profile of phase 0; to be added in ascending order of size, as lists are.
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

/// Arguments behind argument zero of each of the calls.
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
