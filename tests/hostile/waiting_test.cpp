// Everything that another user can make the program wait for: locks, sockets, leases.
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <iostream>

#include "hostile/hostile_test.h"
#include "support/descriptor.h"

namespace vela_test::hostile {

namespace {

using std::chrono::seconds;

/// Another user's lock of a file or directory that it can read; held as long as the object exists.
class ForeignLock {
 public:
  ForeignLock(const std::string& path, int kind)
      : process_(kAttacker, [path, kind] {
          const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
          if (flock(file.Get(), kind) == 0) {
            pause();
          }
        }) {
    const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
    const auto end = std::chrono::steady_clock::now() + kSoon;
    while (flock(file.Get(), LOCK_EX | LOCK_NB) == 0) {
      flock(file.Get(), LOCK_UN);
      if (std::chrono::steady_clock::now() > end) {
        ADD_FAILURE() << path << " was not locked";
        break;
      }
      usleep(1000);
    }
  }

 private:
  UserProcess process_;
};

constexpr int kLockKinds[] = {LOCK_SH, LOCK_EX};

using Waiting = HostileTest;

}  // namespace

TEST_F(Waiting, ALockedMetadataDirectoryIsSkippedAtOnce) {
  MakeJpeg(InPhotos("a.jpg"));
  MakeDirectories(InPhotos("@eaDir"));
  for (const int kind : kLockKinds) {
    SCOPED_TRACE(kind == LOCK_SH ? "shared" : "exclusive");
    const ForeignLock lock(InPhotos("@eaDir"), kind);
    ClearLog();
    RunInTime({kPhotos}, seconds(5));
    EXPECT_EQ(ErrorLines(), Strings{"velathumb:849 Failed to lock " + InPhotos("@eaDir")});
    EXPECT_THAT(ListTree(InPhotos("@eaDir")), IsEmpty());
  }
}

// Both files can be read by everyone, and a shared lock needs no more.
TEST_F(Waiting, LockedCounterAndQueueFilesDoNotStopARun) {
  constexpr seconds kFewWaits(40);
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  for (const char* file : {kPhotoProgress, kQueue}) {
    WriteFile(file, "");
    chmod(file, 0644);
  }
  const ForeignLock counter(kPhotoProgress, LOCK_SH);
  const ForeignLock queue(kQueue, LOCK_SH);
  RunInTime({kPhotos}, kFewWaits);
  EXPECT_TRUE(HasThumbs(photo, FirstKinds(kinds_)));
}

// Everyone may create the daemon's socket while no daemon runs.
TEST_F(Waiting, AStrangersSocketIsNotAsked) {
  if (!HasOtherUsers()) {
    std::cout << "only user 0 exists here: whose socket it is cannot be checked" << std::endl;
    return;
  }
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  const UserProcess stranger(kAttacker, [] {
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    std::string(kDaemonSocket).copy(address.sun_path, sizeof address.sun_path - 1);
    const Descriptor listener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        listen(listener.Get(), 8) != 0 || chmod(kDaemonSocket, 0777) != 0) {
      return;
    }
    for (;;) {
      const Descriptor connection(accept4(listener.Get(), nullptr, nullptr, SOCK_CLOEXEC));
      char byte = 0;
      if (recv(connection.Get(), &byte, 1, 0) == 1) {
        WriteFile("/tmp/asked", "");
        pause();
      }
    }
  });
  ASSERT_TRUE(WaitUntilExists(kDaemonSocket));
  RunInTime();
  EXPECT_FALSE(Exists("/tmp/asked")) << "the stranger was sent a request";
  EXPECT_TRUE(HasThumbs(photo, FirstKinds(kinds_)));
}

// The peer is the user's own, so it is asked, but what it says is limited.
TEST_F(Waiting, AnImmenseReplyIsNotKept) {
  [[maybe_unused]] constexpr uint64_t kMemory = 512U << 20U;
  constexpr size_t kReply = 16U << 20U;
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  DaemonPeer daemon;
  for (const char* reply : {"[", "[1,"}) {
    SCOPED_TRACE(reply);
    RemoveTree(InPhotos("@eaDir"));
    std::string bytes;
    while (bytes.size() < kReply) {
      bytes += reply;
    }
    daemon.Answer("GET_INDEX_VERSION", DaemonReply::BytesThenSilence(bytes));
    ProgramOptions options;
    options.timeLimit = kSoon;
// A sanitizer reserves many times the memory of any limit.
#if !defined(__SANITIZE_ADDRESS__)
    options.beforeExec = {LimitResource(RLIMIT_AS, kMemory)};
#endif
    const ProgramResult result = RunProgram(VelathumbPath(), ArgumentsFor({kPhotos}), options);
    EXPECT_FALSE(result.timedOut);
    EXPECT_EQ(result.exitCode, 0) << result.err;
    EXPECT_TRUE(HasThumbs(photo, FirstKinds(kinds_)));
  }
}

// A lease makes whoever opens the file wait until its holder gives it up, for tens of seconds.
TEST_F(Waiting, ALeaseOnAPhotoDoesNotStopARun) {
  WriteFile("/etc/velainfo.conf", "tool_timeout=\"2\"\n");
  MakeDirectoryOf(kAttacker, InPhotos("d"));
  const std::string photo = MakeJpeg(InPhotos("d/a.jpg"));
  const std::string other = MakeJpeg(InPhotos("d/b.jpg"));
  GiveTo(kAttacker, photo.c_str());
  int ready[2];
  ASSERT_EQ(pipe(ready), 0);
  const Descriptor readable(ready[0]);
  const Descriptor writable(ready[1]);
  const UserProcess holder(kAttacker, [&] {
    signal(SIGIO, SIG_IGN);
    const Descriptor file(open(photo.c_str(), O_RDWR | O_CLOEXEC));
    const char held = fcntl(file.Get(), F_SETLEASE, F_WRLCK) == 0 ? 'y' : 'n';
    if (write(writable.Get(), &held, 1) == 1) {
      pause();
    }
  });
  char held = 0;
  ASSERT_EQ(read(readable.Get(), &held, 1), 1);
  ASSERT_EQ(held, 'y') << "this file system has no leases";
  RunInTime({InPhotos("d")});
  EXPECT_TRUE(HasThumbs(other, FirstKinds(kinds_)));
}

}  // namespace vela_test::hostile
