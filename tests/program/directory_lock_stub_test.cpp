// The lock that keeps instances out of each other's directories.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/seccomp_fail.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kRoot = "/tmp/photos/@eaDir";
constexpr const char* kRefused = "velathumb:849 Failed to lock /tmp/photos/@eaDir";

class InstanceLock : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }
};

TEST_F(InstanceLock, LockedDirectoryIsPassedOverAtOnce) {
  MakeDirectories(MetadataDirOf(kPhoto));
  WriteFile(Marker(kPhoto, "M"), "");
  const DaemonPeer daemon;
  const HeldLock lock(kRoot);
  ASSERT_TRUE(lock.IsHeld());
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_M.fail"));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
}

TEST_F(InstanceLock, SecondInstancePassesOverTheDirectoryOfTheFirst) {
  MakePhoto("/tmp/other/b.jpg");
  PauseConverter();
  DaemonPeer daemon;
  Program first = Start();
  ASSERT_TRUE(IsConverterPaused());
  EXPECT_GOOD_END(Run({kPhotos, "/tmp/other"}));
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg",
                                              "GET_INDEX_VERSION /tmp/other/b.jpg",
                                              "POST_PHOTO_CONVERT /tmp/other/b.jpg"));
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
  Go();
  EXPECT_GOOD_END(*first.Wait());
  EXPECT_THAT(ReportedPhotos(daemon), ElementsAre("/tmp/other/b.jpg", kPhoto));
}

TEST_F(InstanceLock, IsHeldForEachConversionOfTheDirectory) {
  MakePhoto("/tmp/photos/b.jpg");
  for (const int call : {1, 2, 3, 4}) {
    ResetSandbox();
    SetUp();
    MakePhoto("/tmp/photos/b.jpg");
    PauseConverter(call);
    Program program = Start();
    ASSERT_TRUE(IsConverterPaused());
    EXPECT_FALSE(HeldLock(kRoot).IsHeld()) << call;
    Go();
    EXPECT_GOOD_END(*program.Wait());
    EXPECT_TRUE(HeldLock(kRoot).IsHeld()) << call;
  }
}

TEST_F(InstanceLock, IsOnTheDirectoryAtWorkOnly) {
  MakePhoto("/tmp/other/b.jpg");
  MakeDirectories("/tmp/other/@eaDir");
  PauseConverter(3);
  Program program = Start({kPhotos, "/tmp/other"});
  ASSERT_TRUE(IsConverterPaused());
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
  EXPECT_FALSE(HeldLock("/tmp/other/@eaDir").IsHeld());
  Go();
  EXPECT_GOOD_END(*program.Wait());
}

TEST_F(InstanceLock, IsReleasedBeforeTheDirectoryIsQueued) {
  WriteFile(kQueue, "");
  const HeldLock queue(kQueue);
  ASSERT_TRUE(queue.IsHeld());
  const DaemonPeer daemon;
  Program program = Start();
  ASSERT_TRUE(daemon.WaitForRequests(2));
  EXPECT_TRUE(WaitUntilUnlocked(kRoot));
  // Not by its end: it still waits for the queue file.
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(50)).has_value());
  EXPECT_EQ("", ReadFile(kQueue));
}

TEST_F(InstanceLock, IsNotInheritedByTheConverter) {
  EXPECT_GOOD_END(Run());
  ASSERT_EQ(2U, Converter().Calls().size());
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_EQ(3U, call.descriptors.size());
    for (const OpenDescriptor& descriptor : call.descriptors) {
      EXPECT_NE(kRoot, descriptor.target);
    }
  }
}

TEST_F(InstanceLock, DiesWithItsInstance) {
  PauseConverter();
  Program program = Start();
  ASSERT_TRUE(IsConverterPaused());
  program.Kill(SIGKILL);
  program.Wait();
  EXPECT_TRUE(HeldLock(kRoot).IsHeld());
}

TEST_F(InstanceLock, VolumeWithoutLocksIsPassedOver) {
  const DaemonPeer daemon;
  ProgramOptions options;
  options.beforeExec = {SeccompFail(FlockCalls(), ENOLCK)};
  EXPECT_GOOD_END(Run({kPhotos}, options));
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  EXPECT_THAT(ErrorLines(), ElementsAre(kRefused));
}

TEST_F(InstanceLock, LinkToTheSameDirectoryIsTheSameLock) {
  ASSERT_EQ(0, symlink(kPhotos, "/tmp/link"));
  MakeDirectories(kRoot);
  const HeldLock lock(kRoot);
  EXPECT_GOOD_END(Run({"/tmp/link"}));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:849 Failed to lock /tmp/link/@eaDir"));
}

}  // namespace
}  // namespace vela_test
