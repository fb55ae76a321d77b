// Fixture for tests in which another user of the machine, or a fault, works against the program.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <vector>

#include "program/real_program_test.h"
#include "support/other_user.h"
#include "support/tree_record.h"

namespace vela_test::hostile {

using namespace vela_test::real;

/// A tree of user 0 that no run may change, with files of every kind that the program makes or
/// removes in photo directories.
constexpr const char* kVictim = "/tmp/victim";
/// In it: a photo and a text that only user 0 may read, and a text that everyone may write.
constexpr const char* kPrivatePhoto = "/tmp/victim/private.jpg";
constexpr const char* kPrivateText = "/tmp/victim/private.txt";
constexpr const char* kSharedText = "/tmp/victim/shared.txt";
/// Looks like a metadata directory of the photos a.jpg and a.dng.
constexpr const char* kVictimMetadata = "/tmp/victim/metadata";
/// The palette colour of the private photo; test photos have others.
constexpr int kPrivateColour = 40;

/// Time limit for a run over a few photos, however it is disturbed.
constexpr std::chrono::seconds kSoon(120);

/// HasOtherUsers(). Where it is false, says that the calling test cannot check anything: links of
/// user 0 may always be followed.
bool CanDistinguishOwners();

/// What attackers do; each returns whether it succeeded, for ActAs.
bool Link(const std::string& target, const std::string& path);
bool HardLink(const std::string& target, const std::string& path);
bool Fifo(const std::string& path);
/// Puts a link or a named pipe in place of an existing file, in one step.
bool ReplaceByLink(const std::string& target, const std::string& path);
bool ReplaceByHardLink(const std::string& target, const std::string& path);
bool ReplaceByFifo(const std::string& path);

/// Whether the path is one of the converter's unfinished outputs.
bool IsTempOutput(const std::string& path);

/// The number of rounds of a race: enough to win it against a program that can lose it. Multiplied
/// by 20 when the environment has VELA_TEST_ROUNDS=full.
int Rounds(int usual);
/// Whether the environment has VELA_TEST_ROUNDS=full.
bool IsLongRun();

/// The thumbnails of all phases that the first run makes: 0 and 1.
std::vector<Kind> FirstKinds(const std::vector<Kind>& kinds);

/// Real tools, the small kinds, an empty directory kPhotos, and the victim, which must be unchanged
/// when the test ends.
class HostileTest : public RealProgramTest {
 protected:
  void SetUp() override;
  void TearDown() override;

  /// Makes `directory` and gives it to the user.
  static void MakeDirectoryOf(uid_t user, const std::string& directory);
  /// Makes the metadata directory of a photo as the program makes it, open to everyone.
  static void MakeMetadataDir(const std::string& photo);

  /// Runs the program, which must end with 0 in time.
  static ProgramResult RunInTime(const Strings& directories = {kPhotos},
                                 std::chrono::milliseconds limit = kSoon);

  /// Expects all thumbnails that a first run makes, or a marker for every thumbnail.
  void ExpectThumbsOrMarkers(const std::string& photo) const;

  /// Expects no picture in a photo directory that shows the private photo's colour.
  static void ExpectNothingRevealed(const std::string& directory = kPhotos);

  void ExpectVictimUnchanged();

 private:
  static void MakeVictim();

  TreeRecord victim_;
};

}  // namespace vela_test::hostile
