// Fixture: a photo directory and a job of three phases on it.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"
#include "support/files.h"
#include "support/profile_file.h"
#include "support/sandbox.h"
#include "thumb/zero_mask.h"

namespace vela_test {

/// Where the photos of these tests are, and the metadata directory of the first one.
constexpr const char* kDir = "/tmp/photos";
constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kMetadataRoot = "/tmp/photos/@eaDir";
constexpr const char* kMetadata = "/tmp/photos/@eaDir/a.jpg";

/// A sandbox with an empty photo directory. The job has XL (1280) and M (320) in phase 0, B (640)
/// in phase 1 and S (120) in phase 2.
class PassTest : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kMetadata);
    UseProfiles(UsualProfiles());
  }

  /// Gives the job these profiles instead.
  void UseProfiles(const std::vector<ProfileSection>& sections) {
    const std::string file = WriteProfileFile("/tmp/profiles.conf", sections);
    profiles_ = ThumbnailProfileList();
    ASSERT_EQ(1, ParseThumbnailProfiles(profiles_, file, kDir));
    ASSERT_EQ(static_cast<int>(sections.size()), GetProfileCount(profiles_, vela::kAllPhases));
  }

  DirectoryJob Job() const { return {kDir, profiles_}; }

  /// Path of a size class' thumbnail of the photo, under its current or its older name.
  static std::string Thumb(const std::string& sizeClass) {
    return std::string(kMetadata) + "/VELAPHOTO_THUMB_" + sizeClass + ".jpg";
  }
  static std::string OldThumb(const std::string& sizeClass) {
    return std::string(kMetadata) + "/VELAPHOTO:THUMB_" + sizeClass + ".jpg";
  }

  /// Writes a file dated at this point in time.
  static void PutFile(const std::string& path, size_t bytes, int64_t seconds,
                      int64_t nanoseconds = 0) {
    WriteFileOfSize(path, bytes);
    SetFileTime(path, seconds, nanoseconds);
  }

 private:
  ZeroMask mask_;
  ThumbnailProfileList profiles_;
};

}  // namespace vela_test
