// The lock that prevents two instances from processing the same directory.
#include <signal.h>
#include <unistd.h>

#include <cerrno>

#include "program/stub_program_test.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

constexpr const char* kRoot = "/tmp/photos/@eaDir";
constexpr const char* kRefused = "velathumb:849 Failed to lock /tmp/photos/@eaDir";

using InstanceLock = OnePhotoTest;

TEST_F(InstanceLock, LockedDirectoryIsSkippedAtOnce) {
  MakeDirectories(MetadataDirOf(kPhoto));
  WriteFile(Marker(kPhoto, "M"), "");
  const DaemonPeer daemon;
  const HeldLock lock(kRoot);
  ASSERT_TRUE(lock.IsHeld());
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_M.fail"));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
}

TEST_F(InstanceLock, SecondInstanceSkipsTheDirectoryOfTheFirst) {
  MakePhoto("/tmp/other/b.jpg");
  DaemonPeer daemon;
  Program first = StartAndPause();
  EXPECT_SUCCESS(Run({kPhotos, "/tmp/other"}));
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg",
                                              "GET_INDEX_VERSION /tmp/other/b.jpg",
                                              "POST_PHOTO_CONVERT /tmp/other/b.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
  GoAndFinish(first);
  EXPECT_THAT(ReportedPhotos(RequestsOf(daemon)), ElementsAre("/tmp/other/b.jpg", kPhoto));
}

TEST_F(InstanceLock, IsHeldForEachConversionOfTheDirectory) {
  MakePhoto("/tmp/photos/b.jpg");
  for (const int call : {1, 2, 3, 4}) {
    ResetSandbox();
    SetUp();
    MakePhoto("/tmp/photos/b.jpg");
    Program program = StartAndPause(call);
    EXPECT_FALSE(HeldLock(kRoot).IsHeld()) << call;
    GoAndFinish(program);
    EXPECT_TRUE(HeldLock(kRoot).IsHeld()) << call;
  }
}

TEST_F(InstanceLock, IsOnTheDirectoryInProgressOnly) {
  MakePhoto("/tmp/other/b.jpg");
  MakeDirectories("/tmp/other/@eaDir");
  Program program = StartAndPause(3, {kPhotos, "/tmp/other"});
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
  EXPECT_FALSE(HeldLock("/tmp/other/@eaDir").IsHeld());
  GoAndFinish(program);
}

TEST_F(InstanceLock, IsReleasedBeforeTheDirectoryIsQueued) {
  WriteFile(kQueue, "");
  const HeldLock queue(kQueue);
  ASSERT_TRUE(queue.IsHeld());
  const DaemonPeer daemon;
  Program program = Start();
  ASSERT_TRUE(daemon.WaitForRequests(2));
  EXPECT_TRUE(WaitUntilUnlocked(kRoot));
  // The program has not ended: it is still waiting for the queue file.
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(50)).has_value());
  EXPECT_EQ(ReadFile(kQueue), "");
}

TEST_F(InstanceLock, IsNotInheritedByTheConverter) {
  EXPECT_SUCCESS(Run());
  ASSERT_THAT(Converter().Calls(), SizeIs(2));
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_EQ(call.descriptors.size(), 3U);
    for (const OpenDescriptor& descriptor : call.descriptors) {
      EXPECT_NE(descriptor.target, kRoot);
    }
  }
}

TEST_F(InstanceLock, EndsWithItsInstance) {
  Program program = StartAndPause();
  program.Kill(SIGKILL);
  program.Wait();
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(InstanceLock, VolumeWithoutLocksIsSkipped) {
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run({kPhotos}, WithSteps({SeccompFail(FlockCalls(), ENOLCK)})));
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
}

TEST_F(InstanceLock, LinkToTheSameDirectoryIsTheSameLock) {
  ASSERT_EQ(symlink(kPhotos, "/tmp/link"), 0);
  MakeDirectories(kRoot);
  const HeldLock lock(kRoot);
  EXPECT_SUCCESS(Run({"/tmp/link"}));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:849 Failed to lock /tmp/link/@eaDir"));
}

}  // namespace
}  // namespace vela_test
