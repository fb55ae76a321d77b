// The tree scan with a photo queue of a million lines.
#include <gmock/gmock.h>

#include <chrono>
#include <cstdio>
#include <string>
#include <thread>

#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

constexpr const char* kQueue = "/var/spool/thumb_create.queue";
constexpr int kQueueLines = 1000000;
constexpr int kDirectories = 1000;

std::string DirectoryName(int number) {
  return "/tmp/photos/d" + std::to_string(number);
}

/// Bytes that this process has read from files so far.
long long BytesRead() {
  long long bytes = -1;
  std::sscanf(ReadFile("/proc/self/io").c_str(), "rchar: %lld", &bytes);
  return bytes;
}

int ScanForPhotos() {
  int photos = -77;
  int thumbs = -77;
  EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/photos", &photos, &thumbs), 0);
  return photos;
}

/// A queue of a million lines, ten directories of the tree among them, last touched a
/// moment ago.
class LongQueue : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
    for (int i = 0; i < kDirectories; ++i) {
      WriteFile(DirectoryName(i) + "/a.jpg", "photo");
    }
    std::string content;
    for (int i = 0; i < kQueueLines; ++i) {
      const bool isOfTree = i % (kQueueLines / 10) == 17;
      content += isOfTree ? DirectoryName(i / (kQueueLines / 10) * 100)
                          : "/tmp/other/photos/" + std::to_string(i);
      content += '\n';
    }
    WriteFile(kQueue, content);
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
  }
};

TEST_F(LongQueue, IsReadOnceAndNotForEachDirectory) {
  const long long before = BytesRead();
  EXPECT_EQ(ScanForPhotos(), kDirectories - 10);
  const long long read = BytesRead() - before;
  EXPECT_GE(read, FileSize(kQueue)) << "bytes are not counted";
  EXPECT_LT(read, FileSize(kQueue) + FileSize(kQueue) / 4);
}

TEST_F(LongQueue, IsNotReadAgainForAnotherScan) {
  ScanForPhotos();
  const long long before = BytesRead();
  EXPECT_EQ(ScanForPhotos(), kDirectories - 10);
  EXPECT_LT(BytesRead() - before, FileSize(kQueue) / 4);
}

TEST_F(LongQueue, AChangeBetweenTwoScansIsSeen) {
  EXPECT_EQ(ScanForPhotos(), kDirectories - 10);
  AppendToFile(kQueue, DirectoryName(1) + "\n");
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
  EXPECT_EQ(ScanForPhotos(), kDirectories - 11);
  WriteFile("/var/spool/emptied", DirectoryName(1) + "\n" + DirectoryName(2) + "\n");
  ASSERT_EQ(std::rename("/var/spool/emptied", kQueue), 0);
  EXPECT_EQ(ScanForPhotos(), kDirectories - 2);
  WriteFile(kQueue, DirectoryName(1) + "\n" + "/tmp/photos/dd" + "\n");
  EXPECT_EQ(ScanForPhotos(), kDirectories - 1);
}

}  // namespace
}  // namespace vela_test
