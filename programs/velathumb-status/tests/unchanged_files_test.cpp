// Queries change nothing.
#include <signal.h>
#include <sys/stat.h>

#include <chrono>
#include <ostream>
#include <tuple>

#include "running_conversion.h"
#include "status_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// The properties of a file that a change would alter.
struct FileState {
  std::string path;
  ino_t inode;
  off_t size;
  mode_t mode;
  timespec modified;
  timespec changed;
};

auto Members(const FileState& file) {
  return std::tie(file.path, file.inode, file.size, file.mode, file.modified.tv_sec,
                  file.modified.tv_nsec, file.changed.tv_sec, file.changed.tv_nsec);
}

bool operator==(const FileState& a, const FileState& b) {
  return Members(a) == Members(b);
}

void PrintTo(const FileState& file, std::ostream* out) {
  *out << file.path << ", inode " << file.inode << ", " << file.size << " bytes, modified "
       << file.modified.tv_sec << "." << file.modified.tv_nsec << ", changed "
       << file.changed.tv_sec << "." << file.changed.tv_nsec;
}

FileState StateOf(const std::string& path) {
  struct stat status = {};
  EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
  return {path, status.st_ino, status.st_size, status.st_mode, status.st_mtim, status.st_ctim};
}

/// Everything the program could write to.
std::vector<FileState> AllFiles() {
  std::vector<FileState> files;
  for (const std::string place : {"/tmp", "/var/spool", "/run", "/usr/vela", "/etc"}) {
    files.push_back(StateOf(place));
    for (const std::string& name : ListTree(place)) {
      files.push_back(StateOf(place + "/" + name));
    }
  }
  return files;
}

class UnchangedFiles : public StatusTest {
 protected:
  void SetUp() override {
    StatusTest::SetUp();
    MakePhotoWith("a.jpg", kBitS | kBitM);
    SetFileTime(Derived("a.jpg", "VELAPHOTO_THUMB_S.jpg"), kMediaTime - 1);
    WriteFile(Derived("a.jpg", "VELAPHOTO_THUMB_B.fail"), "");
    WriteFile("/tmp/photos/film.mp4", "film");
    MakePhoto("/tmp/photos/below/b.jpg");
    WriteFile("/etc/velainfo.conf", "thumb_conv_resume_time=\"5\"\n");
  }

  static void RunEveryQuery() {
    for (const char* format : {"--progress", "--json"}) {
      EXPECT_EQ(RunStatus({format, "--recursive", "--photos", "/tmp/photos"}).exitCode, 1);
      RunStatus({format, "--queue", "--progress", "--resume-time"});
    }
    RunStatus({"--photos", "/tmp/photos", "/tmp/none"});
    RunStatus({"--queue"});
  }

  /// With entries in the queue it would not end.
  static void WatchBriefly() {
    Program watch = StartProgram(StatusProgramPath(), {"--watch"});
    while (watch.Output().empty() && !watch.Wait(std::chrono::milliseconds(10))) {
    }
    watch.Kill(SIGTERM);
    EXPECT_TRUE(watch.Wait());
  }
};

TEST_F(UnchangedFiles, RemainAfterEveryQueryWithoutQueuesAndProgress) {
  const std::vector<FileState> before = AllFiles();
  RunEveryQuery();
  RunStatus({"--watch"});
  EXPECT_EQ(AllFiles(), before);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(UnchangedFiles, RemainAfterEveryQueryWithQueuesAndProgress) {
  for (const char* queue : {kPhotoQueue, kPhotosInProgress, kVideoQueue, kVideosInProgress}) {
    WriteFile(queue, "/tmp/photos\nR:/tmp/photos/below\n");
  }
  WriteFile("/var/spool/conv_progress_photo", "total=\"5\"\ncompleted=\"2\"\n");
  WriteFile("/var/spool/conv_progress_video", "total=\"5\"\n");
  WriteFile("/var/run/velathumb.4000000.pid", "");
  const std::vector<FileState> before = AllFiles();
  RunEveryQuery();
  WatchBriefly();
  EXPECT_EQ(AllFiles(), before);
}

TEST_F(UnchangedFiles, RemainWhileAnInstanceRuns) {
  const RunningConversion conversion;
  const std::vector<FileState> before = AllFiles();
  RunEveryQuery();
  EXPECT_EQ(AllFiles(), before);
}

TEST_F(UnchangedFiles, RemainAfterAPageIsWrittenElsewhere) {
  MakeThumbs("/tmp/photos/below", "b.jpg", kBitS);
  const std::vector<FileState> before = AllFiles();
  const std::string page = "/dev/shm/page.html";
  EXPECT_EQ(RunStatus({"--html", page, "--recursive", "/tmp/photos"}).exitCode, 1);
  EXPECT_EQ(RunStatus({"--html", page, "--json", "-rp", "/tmp/photos"}).exitCode, 1);
  EXPECT_EQ(AllFiles(), before);
  EXPECT_TRUE(IsRegularFile(page));
  EXPECT_EQ(RunStatus({"--html", "/tmp/photos", "/tmp/photos"}).exitCode, 2);
  EXPECT_EQ(RunStatus({"--html", "/tmp/none/page.html", "/tmp/photos"}).exitCode, 2);
  EXPECT_EQ(AllFiles(), before);
}

TEST_F(UnchangedFiles, RemainBesideAPage) {
  RunStatus({"--html", "/tmp/photos/page.html", "-r", "/tmp/photos"});
  const std::vector<std::string> tree = ListTree("/tmp/photos");
  const FileState photo = StateOf("/tmp/photos/a.jpg");
  const FileState metadata = StateOf("/tmp/photos/@eaDir/a.jpg");
  RunStatus({"--html", "/tmp/photos/page.html", "-r", "/tmp/photos"});
  EXPECT_EQ(ListTree("/tmp/photos"), tree);
  EXPECT_EQ(StateOf("/tmp/photos/a.jpg"), photo);
  EXPECT_EQ(StateOf("/tmp/photos/@eaDir/a.jpg"), metadata);
}

}  // namespace
}  // namespace vela_test
