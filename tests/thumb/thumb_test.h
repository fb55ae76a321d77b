// Shared by the tests of this folder: fixtures, and helpers for this process and its children.
#pragma once

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <climits>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/images.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/privileges.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

/// Runs `work` in a forked child that ends with its result. Returns the exit status (0 to 255), or
/// -1 when a signal ended the child, as SIGALRM does after ten seconds.
inline int ForkCall(const std::function<int()>& work) {
  const pid_t child = fork();
  if (child == 0) {
    alarm(10);
    _exit(work());
  }
  int status = 0;
  if (child < 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
    return -1;
  }
  return WEXITSTATUS(status);
}

/// The path (or "socket:[...]" and the like) that a descriptor refers to.
inline std::string TargetOf(int descriptor) {
  char target[PATH_MAX] = "";
  const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
  const ssize_t length = readlink(link.c_str(), target, sizeof target - 1);
  return length < 0 ? std::string() : std::string(target, static_cast<size_t>(length));
}

/// The descriptors that refer to `path`.
inline std::vector<int> DescriptorsOf(const std::string& path) {
  std::vector<int> found;
  for (const std::string& name : ListDirectory("/proc/self/fd")) {
    const int descriptor = std::atoi(name.c_str());
    if (TargetOf(descriptor) == path) {
      found.push_back(descriptor);
    }
  }
  return found;
}

/// Sets the umask to 0, as in the program, while the object exists.
class ZeroMask {
 public:
  ZeroMask() : before_(umask(0)) {}
  ~ZeroMask() { umask(before_); }
  ZeroMask(const ZeroMask&) = delete;
  ZeroMask& operator=(const ZeroMask&) = delete;

 private:
  mode_t before_;
};

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
    ASSERT_EQ(ParseThumbnailProfiles(profiles_, file, kDir), 1);
    ASSERT_EQ(GetProfileCount(profiles_, vela::kAllPhases), static_cast<int>(sections.size()));
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
