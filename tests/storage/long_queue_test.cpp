// The scans of trees with queues of a million lines.
#include <chrono>
#include <cstdio>
#include <ostream>
#include <thread>

#include "storage/creation_queue.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr int kQueueLines = 1000000;
constexpr int kWaiting = 10;  // entries of the tree in a queue

/// Bytes that this process has read from files so far.
long long BytesRead() {
  long long bytes = -1;
  std::sscanf(ReadFile("/proc/self/io").c_str(), "rchar: %lld", &bytes);
  return bytes;
}

/// Waits until the times of a file are old enough to detect later changes.
void Rest() {
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
}

std::string OtherEntry(int number) {
  return "/tmp/other/media/" + std::to_string(number);
}

/// A scan and the tree that it walks, with one file that needs work in each directory.
struct ScanCase {
  const char* title;
  const char* queueFile;
  int directories;
  bool isVideo;
};

/// Shows the title instead of the addresses of the members, which would become part of test names.
void PrintTo(const ScanCase& scan, std::ostream* out) {
  *out << scan.title;
}

class LongQueue : public QuietTest, public ::testing::WithParamInterface<ScanCase> {
 protected:
  /// Makes a queue that contains ten entries of the tree and is old enough to be indexed.
  void SetUp() override {
    QuietTest::SetUp();
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\nvideo_thumb_size_map=\"1\"\n");
    for (int i = 0; i < GetParam().directories; ++i) {
      WriteFile(DirectoryName(i) + (GetParam().isVideo ? "/a.mp4" : "/a.jpg"), "media");
    }
    constexpr int kDistance = kQueueLines / kWaiting;
    std::string content;
    for (int i = 0; i < kQueueLines; ++i) {
      const bool isOfTree = i % kDistance == 17;
      content +=
          isOfTree ? Entry(i / kDistance * GetParam().directories / kWaiting) : OtherEntry(i);
      content += '\n';
    }
    WriteFile(Queue(), content);
    Rest();
  }

  static const char* Queue() { return GetParam().queueFile; }

  static std::string DirectoryName(int number) { return "/tmp/tree/d" + std::to_string(number); }

  /// The queue entry for the directory.
  static std::string Entry(int number) {
    return DirectoryName(number) + (GetParam().isVideo ? "/a.mp4" : "");
  }

  static int CountWork() {
    if (GetParam().isVideo) {
      return CountVideoWork("/tmp/tree");
    }
    int photos = -77;
    int thumbs = -77;
    EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/tree", &photos, &thumbs), 0);
    return photos;
  }

  /// The work in the tree without the queued entries.
  static int WorkWithout(int waiting) { return GetParam().directories - waiting; }
};

TEST_P(LongQueue, IsReadOnceAndNotForEachLookup) {
  const long long before = BytesRead();
  EXPECT_EQ(CountWork(), WorkWithout(kWaiting));
  const long long read = BytesRead() - before;
  EXPECT_GE(read, FileSize(Queue())) << "bytes are not counted";
  EXPECT_LT(read, FileSize(Queue()) + FileSize(Queue()) / 4);
}

TEST_P(LongQueue, IsNotReadAgainForAnotherScan) {
  CountWork();
  const long long before = BytesRead();
  EXPECT_EQ(CountWork(), WorkWithout(kWaiting));
  EXPECT_LT(BytesRead() - before, FileSize(Queue()) / 4);
}

TEST_P(LongQueue, AChangeBetweenTwoScansIsSeen) {
  EXPECT_EQ(CountWork(), WorkWithout(kWaiting));
  AppendToFile(Queue(), Entry(1) + "\n");
  Rest();
  EXPECT_EQ(CountWork(), WorkWithout(kWaiting + 1));
  WriteFile("/var/spool/emptied", Entry(1) + "\n" + Entry(2) + "\n");
  ASSERT_EQ(std::rename("/var/spool/emptied", Queue()), 0);
  EXPECT_EQ(CountWork(), WorkWithout(2));
  WriteFile(Queue(), Entry(1) + "\n" + "/tmp/tree/dd" + "\n");
  EXPECT_EQ(CountWork(), WorkWithout(1));
}

INSTANTIATE_TEST_SUITE_P(
    Queues, LongQueue,
    ::testing::Values(ScanCase{"WaitingPhotos", kPhotoQueue.file, 1000, false},
                      ScanCase{"PhotosInProgress", kPhotoQueue.tempFile, 1000, false},
                      ScanCase{"WaitingVideos", kVideoQueue.file, 200, true},
                      ScanCase{"VideosInProgress", kVideoQueue.tempFile, 200, true}),
    [](const ::testing::TestParamInfo<ScanCase>& scan) { return std::string(scan.param.title); });

class LongVideoQueues : public QuietTest {};

TEST_F(LongVideoQueues, AreEachReadOnceForTheWorkInThem) {
  constexpr int kWaitingLines = 200000;
  std::string inWork;
  for (int i = 0; i < kQueueLines; ++i) {
    inWork += OtherEntry(i) + '\n';
  }
  std::string waiting;
  for (int i = 0; i < kWaitingLines; ++i) {
    waiting += OtherEntry(-1 - i) + '\n';
  }
  for (const char* name : {"/tmp/both.mp4\n", "/tmp/second.mp4\n"}) {
    inWork += name;
  }
  for (const std::string name : {"/tmp/both.mp4", "/tmp/a.mp4", "/tmp/b.mp4"}) {
    WriteFile(name, "video");
    waiting += name + '\n';
  }
  WriteFile(kVideoQueue.tempFile, inWork);
  WriteFile(kVideoQueue.file, waiting);
  Rest();
  const long long size = FileSize(kVideoQueue.tempFile) + FileSize(kVideoQueue.file);
  const long long before = BytesRead();
  EXPECT_EQ(CountVideoQueueWork(kVideoQueue.file), 2);
  const long long read = BytesRead() - before;
  EXPECT_GE(read, size) << "bytes are not counted";
  EXPECT_LT(read, size + size / 4);
}

}  // namespace
}  // namespace vela_test
