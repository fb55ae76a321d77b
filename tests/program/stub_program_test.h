// Fixture for tests of the whole program against a recording converter.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "program/program_paths.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/named_case.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "support/system_log.h"

namespace vela_test {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using Strings = std::vector<std::string>;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kSettings = "/etc/velainfo.conf";

/// The requests that a photo conversion makes for kPhoto.
constexpr const char* kVersionRequest = "GET_INDEX_VERSION /tmp/photos/a.jpg";
constexpr const char* kReport = "POST_PHOTO_CONVERT /tmp/photos/a.jpg";

/// XL and M in phase 0 (the later phases are made from XL), B in phase 1, S in phase 2.
std::vector<ProfileSection> ThreePhases();

/// A profile whose thumbnail has the usual file name of its size class.
ProfileSection Profile(const std::string& sizeClass, int size, int phase);

/// A size map for the system settings that asks for the thumbnails of ThreePhases().
constexpr const char* kThreePhasesSizeMap = "photo_thumb_size_map=\"23\"\n";

/// The content of a photo's metadata directory after one run, after two runs, and after a failure
/// of all phases.
const Strings kThumbsOfFirstRun = {"VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                   "VELAPHOTO_THUMB_XL.jpg"};
const Strings kAllThumbs = {"VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                            "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_XL.jpg"};
const Strings kAllMarkers = {"VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                             "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"};

/// Makes a small photo, a minute old so that all its thumbnails are newer.
std::string MakePhoto(const std::string& path);

/// Makes several of them in kPhotos.
void MakePhotos(const Strings& names);

/// Makes a photo "a.jpg" in each of these directories, which are made too.
void MakePhotosIn(const Strings& directories);

/// Makes thumbnails of these size classes (complete small pictures, dated now) for a photo.
void PutThumbs(const std::string& photo, const Strings& sizeClasses);

/// Names of the files in a photo's metadata directory.
Strings MetadataOf(const std::string& photo);

/// Keys of the photo progress file in file order: a new key is appended to the file.
Strings ProgressKeys();

void ExpectProgress(int completed, int completedThumb);

/// The source argument of a converter call.
std::string SourceOf(const StubCall& call);

/// The source arguments of all converter calls so far, in order.
Strings ConvertedSources();

/// Each request as "<command> <path>".
Strings RequestsOf(const DaemonPeer& daemon);

/// Paths of the photos that are reported by such requests, in order.
Strings ReportedPhotos(const Strings& requests);

/// Options that differ from the usual ones in one setting.
ProgramOptions InDirectory(const std::string& workingDirectory);
ProgramOptions WithUmask(mode_t umask);
ProgramOptions WithSteps(const std::vector<BeforeExec>& beforeExec);

/// Tries to lock a directory or file exclusively, without waiting, for the lifetime of the object.
class HeldLock {
 public:
  explicit HeldLock(const std::string& path);
  ~HeldLock();
  HeldLock(const HeldLock&) = delete;
  HeldLock& operator=(const HeldLock&) = delete;

  /// Whether the lock was free.
  bool IsHeld() const { return held_; }

 private:
  int descriptor_;
  bool held_;
};

/// Waits until the lock of a directory or file is free, at most ten seconds. Returns whether it is.
bool WaitUntilUnlocked(const std::string& path);

/// A sandbox with the profile file, an empty photo directory and a converter that works.
class StubProgramTest : public SandboxTest {
 protected:
  void SetUp() override;

  /// Runs the program with the usual profile file.
  static ProgramResult Run(const Strings& directories = {kPhotos},
                           const ProgramOptions& options = ProgramOptions());
  static Program Start(const Strings& directories = {kPhotos},
                       const ProgramOptions& options = ProgramOptions());

  /// Runs the program, which must succeed, with a daemon whose index has version 0. Returns the
  /// requests as "<command> <path>".
  static Strings RunWithDaemon(const Strings& directories = {kPhotos},
                               const ProgramOptions& options = ProgramOptions());

  /// The same over kPhotos; `observe` is called with each request before the daemon answers it.
  static Strings RunAndObserve(const std::function<void(const std::string& request)>& observe);

  /// Starts the program and waits until the converter's call with this number has made its outputs.
  /// The call does not end before Go().
  Program StartAndPause(int call = 1, const Strings& directories = {kPhotos},
                        const ProgramOptions& options = ProgramOptions()) const;
  static void Go();
  /// Go(); then waits for the end of the program, which must succeed.
  static void GoAndFinish(Program& program);

  const StubTool& Converter() const { return *converter_; }
  StubTool& Converter() { return *converter_; }

 private:
  std::unique_ptr<StubTool> converter_;
};

/// The same with a photo at kPhoto.
class OnePhotoTest : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }
};

/// Expects exit status 0 and no output, whatever happened to the photos.
#define EXPECT_SUCCESS(result)                            \
  do {                                                    \
    const ::vela_test::ProgramResult endedRun = (result); \
    EXPECT_EQ(endedRun.exitCode, 0);                      \
    EXPECT_EQ(endedRun.out, "");                          \
    EXPECT_EQ(endedRun.err, "");                          \
  } while (false)

}  // namespace vela_test
