#include "hostile/hostile_test.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <iostream>

namespace vela_test::hostile {

namespace {

constexpr int64_t kLongAgo = 1000000000;

void Age(const std::string& directory) {
  Strings paths = ListTree(directory);
  // Directories last, those further down first.
  for (auto path = paths.rbegin(); path != paths.rend(); ++path) {
    SetFileTime(directory + "/" + *path, kLongAgo);
  }
  SetFileTime(directory, kLongAgo);
}

void FillMetadata(const std::string& directory) {
  MakeDirectories(directory);
  chmod(directory.c_str(), 0755);
  for (const char* name : {"VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO_THUMB_M.jpg", "Temp_0.jpg",
                           "VELAPHOTO.tmp.aBcDeF.jpg", "VELAPHOTO_THUMB_RAW.jpg"}) {
    CopyFile(kPrivatePhoto, directory + "/" + name);
    chmod((directory + "/" + name).c_str(), 0600);
  }
  for (const char* name :
       {"VELAPHOTO_THUMB_XL.fail", "VELAPHOTO_THUMB_S.fail", "RAW_TEMP.ppm", "other.fail"}) {
    WriteFile(directory + "/" + name, "");
    chmod((directory + "/" + name).c_str(), 0600);
  }
}

/// The new file is made elsewhere, since the watched name must change in one step.
bool PutInPlace(bool isMade, const std::string& made, const std::string& path) {
  return isMade && std::rename(made.c_str(), path.c_str()) == 0;
}

std::string NewNameFor(const std::string& path) {
  unlink((path + ".new").c_str());
  return path + ".new";
}

}  // namespace

bool CanDistinguishOwners() {
  if (!HasOtherUsers()) {
    std::cout << "only user 0 exists here: nothing is checked about other users' links"
              << std::endl;
  }
  return HasOtherUsers();
}

bool Link(const std::string& target, const std::string& path) {
  return symlink(target.c_str(), path.c_str()) == 0;
}

bool HardLink(const std::string& target, const std::string& path) {
  return link(target.c_str(), path.c_str()) == 0;
}

bool Fifo(const std::string& path) {
  return mkfifo(path.c_str(), 0666) == 0;
}

bool ReplaceByLink(const std::string& target, const std::string& path) {
  const std::string made = NewNameFor(path);
  return PutInPlace(Link(target, made), made, path);
}

bool ReplaceByHardLink(const std::string& target, const std::string& path) {
  const std::string made = NewNameFor(path);
  return PutInPlace(HardLink(target, made), made, path);
}

bool ReplaceByFifo(const std::string& path) {
  const std::string made = NewNameFor(path);
  return PutInPlace(Fifo(made), made, path);
}

bool IsTempOutput(const std::string& path) {
  return path.find("/VELAPHOTO.tmp.") != std::string::npos &&
         path.compare(path.size() - 4, 4, ".jpg") == 0;
}

bool IsLongRun() {
  const char* const rounds = getenv("VELA_TEST_ROUNDS");
  return rounds != nullptr && std::string(rounds) == "full";
}

int Rounds(int usual) {
  constexpr int kLonger = 20;
  return IsLongRun() ? usual * kLonger : usual;
}

std::vector<Kind> FirstKinds(const std::vector<Kind>& kinds) {
  std::vector<Kind> first = OfPhase(kinds, 0);
  const std::vector<Kind> second = OfPhase(kinds, 1);
  first.insert(first.end(), second.begin(), second.end());
  return first;
}

void HostileTest::SetUp() {
  RealProgramTest::SetUp();
  InstallRealTools();
  // Directories that attackers use are theirs; this one is not, unless a test gives it away.
  chmod(kPhotos, 0755);
  MakeVictim();
  victim_ = RecordTree(kVictim);
}

void HostileTest::TearDown() {
  ExpectVictimUnchanged();
}

void HostileTest::MakeVictim() {
  MakeDirectories(kVictim);
  chmod(kVictim, 0755);
  MakePlainPhoto(kPrivatePhoto, kPrivateColour);
  WriteFile(kPrivateText, "only for user 0\n");
  WriteFile(kSharedText, "for everyone\n");
  chmod(kPrivatePhoto, 0600);
  chmod(kPrivateText, 0600);
  chmod(kSharedText, 0666);
  const std::string metadata = kVictimMetadata;
  for (const std::string& directory : {metadata, metadata + "/a.jpg", metadata + "/a.dng"}) {
    FillMetadata(directory);
  }
  Age(kVictim);
}

void HostileTest::ExpectVictimUnchanged() {
  EXPECT_THAT(Differences(victim_, RecordTree(kVictim)), IsEmpty())
      << "the run has changed files outside the photos";
}

void HostileTest::MakeDirectoryOf(uid_t user, const std::string& directory) {
  MakeDirectories(directory);
  chmod(directory.c_str(), 0755);
  GiveTo(user, directory.c_str());
}

void HostileTest::MakeMetadataDir(const std::string& photo) {
  MakeDirectories(MetadataDirOf(photo));
}

ProgramResult HostileTest::RunInTime(const Strings& directories, std::chrono::milliseconds limit) {
  ProgramOptions options;
  options.timeLimit = limit;
  const ProgramResult result = RunProgram(VelathumbPath(), ArgumentsFor(directories), options);
  EXPECT_FALSE(result.timedOut) << "still running after " << limit.count() << " ms";
  if (!result.timedOut) {
    EXPECT_EQ(result.exitCode, 0) << result.err;
  }
  return result;
}

void HostileTest::ExpectThumbsOrMarkers(const std::string& photo) const {
  const auto thumbs = HasThumbs(photo, FirstKinds(kinds_));
  const auto markers = IsMarkedFailed(photo, kinds_);
  EXPECT_TRUE(thumbs || markers) << thumbs.message() << "; " << markers.message();
}

void HostileTest::ExpectNothingRevealed(const std::string& directory) {
  for (const std::string& path : ListTree(directory)) {
    struct stat status {};
    const std::string file = directory + "/" + path;
    if (lstat(file.c_str(), &status) == 0 && S_ISREG(status.st_mode)) {
      EXPECT_NE(PaletteIndexOf(file), kPrivateColour) << file << " shows the private photo";
    }
  }
}

}  // namespace vela_test::hostile
