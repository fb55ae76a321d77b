// Fixture for tests of the whole program against a recording converter.
#pragma once

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "support/daemon_peer.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {

constexpr const char* kPhotos = "/tmp/photos";
constexpr const char* kProfiles = "/tmp/profiles.conf";
constexpr const char* kQueue = "/var/spool/thumb_create.queue";
constexpr const char* kPhotoProgress = "/var/spool/conv_progress_photo";
constexpr const char* kSettings = "/etc/velainfo.conf";

/// XL and M in phase 0 (XL is the one that the later phases are made from), B in phase 1, S in
/// phase 2.
std::vector<ProfileSection> ThreePhases();

/// What is needed of those profiles, as a size map for the system settings.
constexpr const char* kThreePhasesSizeMap = "photo_thumb_size_map=\"23\"\n";

/// `path` as a path of the photo's metadata directory.
std::string MetadataDirOf(const std::string& photo);

/// Thumbnail of a size class ("XL", "M", ...) of a photo, under its current or its older name.
std::string Thumb(const std::string& photo, const std::string& sizeClass);
std::string OldThumb(const std::string& photo, const std::string& sizeClass);

/// Failure marker of a size class of a photo.
std::string Marker(const std::string& photo, const std::string& sizeClass);

/// Makes a small photo, dated a minute back so that everything made of it is newer.
std::string MakePhoto(const std::string& path);

/// Puts thumbnails of these size classes (whole small pictures, dated now) beside a photo.
void PutThumbs(const std::string& photo, const std::vector<std::string>& sizeClasses);

/// Names of what is in a photo's metadata directory.
std::vector<std::string> MetadataOf(const std::string& photo);

/// Photo progress: the value of a key, 0 when it is not there.
int Progress(const std::string& key);

/// Keys of the photo progress file in file order: a new key is appended to the file.
std::vector<std::string> ProgressKeys();

/// The source argument of a converter call.
std::string SourceOf(const StubCall& call);

/// The source arguments of all converter calls so far, in order.
std::vector<std::string> ConvertedSources();

/// The arguments with the random part of temporary names replaced by "??????".
std::vector<std::string> WithoutRandomNames(std::vector<std::string> arguments);

/// Each request as "<command> <path>".
std::vector<std::string> RequestsOf(const DaemonPeer& daemon);

/// Paths of the photos reported to the daemon, in order.
std::vector<std::string> ReportedPhotos(const DaemonPeer& daemon);

/// Takes the exclusive lock of a directory or file without waiting, for as long as the object
/// lives.
class HeldLock {
 public:
  explicit HeldLock(const std::string& path);
  ~HeldLock();
  HeldLock(const HeldLock&) = delete;
  HeldLock& operator=(const HeldLock&) = delete;

  /// Whether nobody else had it.
  bool IsHeld() const { return held_; }

 private:
  int descriptor_;
  bool held_;
};

/// Waits until the lock of a directory or file can be had, at most `milliseconds`.
bool WaitUntilUnlocked(const std::string& path, int milliseconds = 10000);

/// A sandbox with the profile file, an empty photo directory and a converter that works.
class StubProgramTest : public SandboxTest {
 protected:
  void SetUp() override;

  /// Runs the program with the usual profile file.
  static ProgramResult Run(const std::vector<std::string>& directories = {kPhotos},
                           const ProgramOptions& options = ProgramOptions());
  static Program Start(const std::vector<std::string>& directories = {kPhotos},
                       const ProgramOptions& options = ProgramOptions());

  /// Makes the converter's call with this number stop after its outputs until Go() is called.
  void PauseConverter(int call = 1) const;
  /// Waits until it has stopped there; whether it did.
  static bool IsConverterPaused();
  static void Go();

  const StubTool& Converter() const { return *converter_; }
  StubTool& Converter() { return *converter_; }

 private:
  std::unique_ptr<StubTool> converter_;
};

/// Ends well, as a run has to whatever became of its photos.
#define EXPECT_GOOD_END(result)                           \
  do {                                                    \
    const ::vela_test::ProgramResult endedRun = (result); \
    EXPECT_EQ(0, endedRun.exitCode);                      \
    EXPECT_EQ("", endedRun.out);                          \
    EXPECT_EQ("", endedRun.err);                          \
  } while (false)

}  // namespace vela_test
