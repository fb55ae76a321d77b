// Attacks on the tree walk, on the queue runner and on the status page.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>

#include "hostile/hostile_test.h"
#include "platform/velaindex.h"
#include "support/descriptor.h"

namespace vela_test::hostile {

namespace {

class Companions : public HostileTest {
 protected:
  static std::string MakePhotoOf(uid_t user, const std::string& directory) {
    MakeDirectoryOf(user, InPhotos(directory));
    const std::string photo = MakeJpeg(InPhotos(directory + "/a.jpg"));
    GiveTo(user, photo.c_str());
    return photo;
  }

  static void Enqueue(const std::string& directory) {
    EXPECT_EQ(WriteIndexQueue(InPhotos(directory).c_str(), kQueue), 0);
  }

  static Program StartRunner() {
    return StartProgram(BuiltPath(VELATHUMB_QUEUE_FILE),
                        {"--velathumb", VelathumbPath(), "--profile", kProfiles, "--follow"});
  }

  static bool GetsThumbs(const std::string& photo, int milliseconds) {
    return WaitUntilExists(Thumb(photo, "L"), milliseconds);
  }
};

}  // namespace

TEST_F(Companions, TreeWalkContinuesPastLinksThatLeadNowhere) {
  Strings photos;
  for (const char* name : {"a", "c", "m", "x", "z"}) {
    photos.push_back(MakePhotoOf(kOwner, name));
  }
  MakeDirectoryOf(kAttacker, InPhotos("k"));
  ActAs(kAttacker, [] {
    return Link("loop", InPhotos("k/loop")) && Link("b", InPhotos("k/a")) &&
           Link("a", InPhotos("k/b")) && Link("/nonexistent", InPhotos("k/gone")) &&
           Link("..", InPhotos("k/up"));
  });
  // Directly in the tree as well, wherever the walk begins.
  for (const char* name : {"0loop", "loop", "zloop"}) {
    EXPECT_TRUE(Link(name, InPhotos(name)));
  }
  RunInTime({"R:/tmp/photos"});
  for (const std::string& photo : photos) {
    EXPECT_TRUE(HasThumbs(photo, FirstKinds(kinds_)));
  }
}

TEST_F(Companions, RunnerTakesNewEntriesWhileADirectoryIsLocked) {
  for (const int kind : {LOCK_EX, LOCK_SH}) {
    SCOPED_TRACE(kind == LOCK_SH ? "shared" : "exclusive");
    RemoveTree(InPhotos("locked"));
    RemoveTree(InPhotos("free"));
    const std::string locked = MakePhotoOf(kAttacker, "locked");
    const std::string open = MakePhotoOf(kOwner, "free");
    MakeDirectories(InPhotos("locked/@eaDir"));
    Descriptor lock(::open(InPhotos("locked/@eaDir").c_str(), O_RDONLY | O_CLOEXEC));
    ASSERT_EQ(flock(lock.Get(), kind), 0);
    ClearLog();
    Enqueue("locked");
    const Program runner = StartRunner();
    EXPECT_TRUE(WaitUntilGone(kQueue));
    // The runner has taken the locked directory, and has tried it when the queue is empty again.
    usleep(500000);
    Enqueue("free");
    EXPECT_TRUE(GetsThumbs(open, 15000)) << "other directories wait for the locked one";
    EXPECT_FALSE(Exists(Thumb(locked, "L")));
    lock.Close();
    EXPECT_TRUE(GetsThumbs(locked, 40000)) << "the locked directory's entry is lost";
  }
}

TEST_F(Companions, StatusPageIsNotWrittenThroughALink) {
  MakePhotoOf(kAttacker, "d");
  const std::string page = InPhotos("d/page.html");
  ProgramOptions options;
  options.timeLimit = kSoon;
  if (CanDistinguishOwners()) {
    ActAs(kAttacker, [&] { return Link(kPrivateText, page); });
    const ProgramResult linked =
        RunProgram(BuiltPath(VELATHUMB_STATUS_FILE), {"--html", page, InPhotos("d")}, options);
    EXPECT_FALSE(linked.timedOut);
    ExpectVictimUnchanged();
    RemoveTree(page);
  }
  ActAs(kAttacker, [&] { return Fifo(page); });
  const ProgramResult piped =
      RunProgram(BuiltPath(VELATHUMB_STATUS_FILE), {"--html", page, InPhotos("d")}, options);
  EXPECT_FALSE(piped.timedOut);
  // An ordinary page is written as always.
  RunProgram(BuiltPath(VELATHUMB_STATUS_FILE), {"--html", "/tmp/page.html", InPhotos("d")},
             options);
  EXPECT_GT(FileSize("/tmp/page.html"), 0);
}

TEST_F(Companions, ListOfFailedPhotosFollowsNoLinkOfOthersWaitsForNoPipeAndHasOneLineForEach) {
  MakeDirectoryOf(kAttacker, InPhotos("d"));
  const std::string odd = InPhotos("d/a\n\x1b[2J: fine.jpg");
  const std::string linked = InPhotos("d/b.jpg");
  const std::string piped = InPhotos("d/c.jpg");
  for (const std::string& photo : {odd, linked, piped}) {
    WriteFile(photo, "no photo");
    GiveTo(kAttacker, photo.c_str());
    MakeMetadataDir(photo);
    WriteFile(MetadataDirOf(photo) + "/VELAPHOTO_THUMB_S.fail", "");
  }
  const bool hasOwners = CanDistinguishOwners();
  if (hasOwners) {
    ActAs(kAttacker,
          [&] { return Link(kPrivatePhoto, MetadataDirOf(linked) + "/VELAPHOTO_THUMB_XL.jpg"); });
  }
  ActAs(kAttacker, [&] { return Fifo(MetadataDirOf(piped) + "/VELAPHOTO_THUMB_XL.jpg"); });
  ProgramOptions options;
  options.timeLimit = kSoon;
  const ProgramResult result =
      RunProgram(BuiltPath(VELATHUMB_STATUS_FILE), {"--failed", InPhotos("d")}, options);
  EXPECT_FALSE(result.timedOut);
  EXPECT_EQ(std::count(result.out.begin(), result.out.end(), '\n'), 3) << result.out;
  EXPECT_EQ(result.out.find('\x1b'), std::string::npos);
  if (hasOwners) {
    EXPECT_EQ(result.out.find("can be converted"), std::string::npos) << result.out;
  }
}

}  // namespace vela_test::hostile
