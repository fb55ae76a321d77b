// Directories that other users may change: what they put under the names of outputs is neither
// written to nor waited for.

#include <fcntl.h>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <thread>

#include "converter_fixture.h"
#include "posix/file_descriptor.h"
#include "support/seccomp_fail.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr char kVictim[] = "/tmp/victim";
constexpr char kContent[] = "belongs to somebody else";

bool IsUntouched(const std::string& path) {
  return ReadFile(path) == kContent;
}

class HostileOutputs : public ConverterTest {
 protected:
  /// Writable for everybody.
  const std::string shared_ = directory_ + "/shared";
  const std::string output_ = shared_ + "/o.jpg";

  void SetUp() override {
    ConverterTest::SetUp();
    MakeDirectories(shared_);
    ASSERT_EQ(chmod(shared_.c_str(), 0777), 0);
    WriteFile(kVictim, kContent);
  }

  /// A photo that the converter makes the thumbnails of itself, and one that it leaves to
  /// ImageMagick.
  std::vector<std::string> Photos() const {
    return {MakePhoto("a.jpg", 300, 200), MakePicture("a.bmp", 300, 200)};
  }

  ProgramResult ConvertTo(const std::string& photo, const std::string& output) const {
    ProgramOptions options;
    options.timeLimit = std::chrono::seconds(20);
    const CommandLine line{photo, directory_, {{{}, output}}};
    return RunConverter(line.Arguments(), options);
  }

  /// Expects that the output, which exists, is neither written to nor removed.
  void ExpectRefused(const std::string& photo) const {
    struct stat before = {};
    struct stat after = {};
    ASSERT_EQ(lstat(output_.c_str(), &before), 0);
    const ProgramResult result = ConvertTo(photo, output_);
    EXPECT_EQ(result.exitCode, 1) << photo;
    EXPECT_THAT(result.err, StartsWith("convert-thumb: ")) << photo;
    ASSERT_EQ(lstat(output_.c_str(), &after), 0) << photo;
    EXPECT_EQ(after.st_ino, before.st_ino) << photo;
    EXPECT_TRUE(IsUntouched(kVictim)) << photo;
  }
};

TEST_F(HostileOutputs, LinksAreRefused) {
  ASSERT_EQ(symlink(kVictim, output_.c_str()), 0);
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
  }
}

TEST_F(HostileOutputs, LinksToMissingFilesAreRefused) {
  ASSERT_EQ(symlink("../new.jpg", output_.c_str()), 0);
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
    EXPECT_FALSE(Exists(directory_ + "/new.jpg"));
  }
}

TEST_F(HostileOutputs, FurtherNamesOfFilesAreRefused) {
  ASSERT_EQ(link(kVictim, output_.c_str()), 0);
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
  }
}

TEST_F(HostileOutputs, PipesAreRefused) {
  ASSERT_EQ(mkfifo(output_.c_str(), 0666), 0);
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
  }
}

TEST_F(HostileOutputs, FilesOfOtherUsersAreRefused) {
  WriteFile(output_, kContent);
  if (chown(output_.c_str(), 1, 1) != 0) {
    return;  // an ordinary user's sandbox has no other users
  }
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
    EXPECT_TRUE(IsUntouched(output_));
  }
}

TEST_F(HostileOutputs, DirectoriesAreRefused) {
  MakeDirectories(output_);
  for (const std::string& photo : Photos()) {
    ExpectRefused(photo);
  }
}

TEST_F(HostileOutputs, OwnFilesAreReplacedByNewOnes) {
  for (const std::string& photo : Photos()) {
    WriteFile(output_, kContent);
    struct stat before = {};
    ASSERT_EQ(stat(output_.c_str(), &before), 0);
    // Whoever has opened the former file must not be able to change the new one.
    const FileDescriptor held(open(output_.c_str(), O_RDONLY | O_CLOEXEC));
    ExpectSuccess(ConvertTo(photo, output_));
    struct stat after = {};
    ASSERT_EQ(stat(output_.c_str(), &after), 0);
    EXPECT_NE(after.st_ino, before.st_ino) << photo;
    EXPECT_TRUE(IsWholeJpeg(output_)) << photo;
  }
}

/// Links of other users among the directories of an output.
TEST_F(HostileOutputs, LinksToDirectoriesOfOthersAreRefused) {
  MakeDirectories("/tmp/private");
  const std::string link = shared_ + "/link";
  ASSERT_EQ(symlink("/tmp/private", link.c_str()), 0);
  const std::vector<std::string> photos = Photos();
  for (const std::string& photo : photos) {
    ExpectSuccess(ConvertTo(photo, link + "/o.jpg"));
    RemoveTree("/tmp/private/o.jpg");
  }
  if (lchown(link.c_str(), 1, 1) != 0) {
    return;
  }
  for (const std::string& photo : photos) {
    EXPECT_EQ(ConvertTo(photo, link + "/o.jpg").exitCode, 1) << photo;
    EXPECT_THAT(ListDirectory("/tmp/private"), IsEmpty()) << photo;
  }
}

TEST_F(HostileOutputs, OnlyTheNullDeviceIsAcceptedBehindLinks) {
  const std::vector<std::string> photos = Photos();
  ASSERT_EQ(symlink("/dev/null", output_.c_str()), 0);
  for (const std::string& photo : photos) {
    ExpectSuccess(ConvertTo(photo, output_));
  }
  RemoveTree(output_);
  ASSERT_EQ(symlink("/dev/zero", output_.c_str()), 0);
  for (const std::string& photo : photos) {
    ExpectRefused(photo);
  }
}

/// Without Landlock, links in place of ImageMagick's temporary files could lead anywhere.
TEST_F(HostileOutputs, WithoutLandlockThereAreNoTemporaryFilesInASharedDirectory) {
  // Larger than the part of the limit for pictures in memory.
  SetMemoryLimit("8M");
  const std::string photo = MakePicture("large.bmp", 1600, 1200);
  ProgramOptions withoutLandlock;
  withoutLandlock.beforeExec = {SeccompFail({SYS_landlock_create_ruleset}, ENOSYS)};
  const auto statusWith = [&](const std::string& scratch, const ProgramOptions& options) {
    const CommandLine line{photo, scratch, {{{}, directory_ + "/o.jpg"}}};
    return RunConverter(line.Arguments(), options).exitCode;
  };
  EXPECT_EQ(statusWith(directory_, withoutLandlock), 0);
  EXPECT_EQ(statusWith("/tmp", withoutLandlock), 0);
  EXPECT_EQ(statusWith(shared_, withoutLandlock), 1);
  EXPECT_EQ(statusWith(shared_, ProgramOptions()), 0);
}

/// Puts a link under the name of each file that is created or removed in a directory, as fast as
/// the kernel reports it.
class LinkPlanter {
 public:
  explicit LinkPlanter(std::string directory)
      : directory_(std::move(directory)), events_(inotify_init1(IN_CLOEXEC | IN_NONBLOCK)) {
    EXPECT_GE(inotify_add_watch(events_.Get(), directory_.c_str(),
                                IN_CREATE | IN_DELETE | IN_OPEN | IN_MOVED_TO),
              0);
    thread_ = std::thread([this] { Run(); });
  }
  ~LinkPlanter() {
    stopped_ = true;
    thread_.join();
  }
  LinkPlanter(const LinkPlanter&) = delete;
  LinkPlanter& operator=(const LinkPlanter&) = delete;

 private:
  void Run() const {
    unsigned turn = 0;
    while (!stopped_) {
      pollfd ready = {events_.Get(), POLLIN, 0};
      if (poll(&ready, 1, 10) > 0) {
        alignas(inotify_event) char buffer[16384];
        const ssize_t size = read(events_.Get(), buffer, sizeof buffer);
        for (ssize_t at = 0; at < size;) {
          const auto* const event = reinterpret_cast<const inotify_event*>(buffer + at);
          if (event->len > 0) {
            Plant(directory_ + "/" + event->name, turn++);
          }
          at += static_cast<ssize_t>(sizeof *event + event->len);
        }
      }
    }
  }

  /// Sometimes waits for the name to become free, sometimes takes it.
  static void Plant(const std::string& path, unsigned turn) {
    if (turn % 2 == 0) {
      unlink(path.c_str());
    }
    static_cast<void>(symlink(kVictim, path.c_str()));
  }

  std::string directory_;
  FileDescriptor events_;
  std::atomic<bool> stopped_{false};
  std::thread thread_;
};

TEST_F(HostileOutputs, LinksPlantedDuringTheRunAreNotWrittenThrough) {
  constexpr int kRuns = 200;
  const std::vector<std::string> photos = Photos();
  const LinkPlanter planter(shared_);
  for (int run = 0; run < kRuns; ++run) {
    // Mostly the fast one: more chances to hit the moment between two system calls.
    CommandLine line{photos[run % 10 == 9 ? 1 : 0], directory_, {}};
    for (const char* name : {"one", "two", "three"}) {
      line.outputs.push_back({Square(60), shared_ + "/" + name + ".jpg"});
    }
    RunConverter(line.Arguments());
    ASSERT_TRUE(IsUntouched(kVictim)) << run;
  }
}

TEST_F(HostileOutputs, LinksPlantedDuringATurnAreNotWrittenThrough) {
  constexpr int kRuns = 60;
  for (int run = 0; run < kRuns; ++run) {
    JpegRecipe recipe;
    // Every third one has to be decoded.
    recipe.width = run % 3 == 0 ? 70 : 64;
    MakeJpeg(output_, recipe);
    {
      const LinkPlanter planter(shared_);
      RunConverter({"-rotate", "90", output_, output_});
    }
    ASSERT_TRUE(IsUntouched(kVictim)) << run;
    RemoveTree(shared_);
    MakeDirectories(shared_);
    ASSERT_EQ(chmod(shared_.c_str(), 0777), 0);
  }
}

}  // namespace
}  // namespace vela_test
