// Status and times of files, free space of volumes.
#include <fcntl.h>

#include "platform/platform_fixture.h"
#include "support/mounts.h"

namespace vela_test {
namespace {

constexpr const char* kFile = "/tmp/file";

FileTime Of(const VLIBCTime& time) {
  return {time.seconds, time.nanoseconds};
}

class FileStatusTest : public SandboxTest {};

TEST_F(FileStatusTest, HasTypeModeSizeAndBlocks) {
  WriteFile(kFile, std::string(5000, 'x'));
  ASSERT_EQ(chmod(kFile, 04751), 0);
  struct stat expected;
  ASSERT_EQ(stat(kFile, &expected), 0);
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat(kFile, 9, &status), 0);
  EXPECT_EQ(status.mode, static_cast<uint32_t>(S_IFREG | 04751));
  EXPECT_EQ(status.size, 5000);
  EXPECT_EQ(status.blocks, expected.st_blocks);
  EXPECT_GT(status.blocks, 0);
}

TEST_F(FileStatusTest, HasTheThreeTimesInTheirOrder) {
  WriteFile(kFile, "x");
  const timespec times[2] = {{1000000001, 11}, {1000000002, 222222222}};
  ASSERT_EQ(utimensat(AT_FDCWD, kFile, times, 0), 0);
  struct stat expected;
  ASSERT_EQ(stat(kFile, &expected), 0);
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat(kFile, 9, &status), 0);
  EXPECT_EQ(Of(status.access), (FileTime{1000000001, 11}));
  EXPECT_EQ(Of(status.modification), (FileTime{1000000002, 222222222}));
  EXPECT_EQ(Of(status.change), (FileTime{expected.st_ctim.tv_sec, expected.st_ctim.tv_nsec}));
}

TEST_F(FileStatusTest, FollowsLinks) {
  WriteFile(kFile, "12345");
  ASSERT_EQ(symlink(kFile, "/tmp/link"), 0);
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/link", 9, &status), 0);
  EXPECT_TRUE(S_ISREG(status.mode));
  EXPECT_EQ(status.size, 5);
}

TEST_F(FileStatusTest, FailsForAMissingFile) {
  VLIBCFileStatus status;
  EXPECT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBCFileStat("", 9, &status), -1);
  EXPECT_EQ(VLIBCFileStat(nullptr, 9, &status), -1);
  EXPECT_EQ(VLIBCFileStat("/tmp", 9, nullptr), -1);
}

class FileTimes : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kFile, "x");
    SetFileTime(kFile, 1000, 10);
  }
};

constexpr VLIBCFileTimes kTimes = {{2000000000, 1}, {2100000000, 999999999}, {5, 5}};

TEST_F(FileTimes, AreSetToTheNanosecondAsTheOptionsSelect) {
  const struct {
    const char* name;
    int options;
    VLIBCFileTimes times;
    FileTime access;
    FileTime modification;
  } cases[] = {
      {"both", 3, kTimes, {2000000000, 1}, {2100000000, 999999999}},
      {"access time only", 1, kTimes, {2000000000, 1}, {1000, 10}},
      {"modification time only", 2, kTimes, {1000, 10}, {2100000000, 999999999}},
      {"before the epoch", 3, {{-100, 0}, {-200, 5}, {0, 0}}, {-100, 0}, {-200, 5}},
      {"invalid times not selected", 2, {{5, -1}, {7, 8}, {0, -1}}, {1000, 10}, {7, 8}},
  };
  for (const auto& one : cases) {
    SCOPED_TRACE(one.name);
    SetFileTime(kFile, 1000, 10);
    EXPECT_EQ(VLIBCFileUTime(kFile, one.options, &one.times), 0);
    EXPECT_EQ(AccessTime(kFile), one.access);
    EXPECT_EQ(ModificationTime(kFile), one.modification);
  }
}

TEST_F(FileTimes, DoesNotSetTheThirdPair) {
  EXPECT_EQ(VLIBCFileUTime(kFile, 3, &kTimes), 0);
  struct stat status;
  ASSERT_EQ(stat(kFile, &status), 0);
  EXPECT_GT(status.st_ctim.tv_sec, 1000000000);
}

TEST_F(FileTimes, FollowsLinks) {
  ASSERT_EQ(symlink(kFile, "/tmp/link"), 0);
  EXPECT_EQ(VLIBCFileUTime("/tmp/link", 3, &kTimes), 0);
  EXPECT_EQ(ModificationTime(kFile), (FileTime{2100000000, 999999999}));
}

TEST_F(FileTimes, RefusesNanosecondsOutOfRange) {
  // Two of these are what the system call takes for "now" and "leave as it is".
  for (const int64_t nanoseconds : {int64_t{-1}, int64_t{1000000000}, int64_t{UTIME_NOW},
                                    int64_t{UTIME_OMIT}, int64_t{1} << 40}) {
    const VLIBCFileTimes times = {{5, nanoseconds}, {5, nanoseconds}, {0, 0}};
    EXPECT_EQ(VLIBCFileUTime(kFile, 3, &times), -1);
    EXPECT_EQ(VLIBCErrGet(), EINVAL);
  }
  EXPECT_EQ(ModificationTime(kFile), (FileTime{1000, 10}));
}

TEST_F(FileTimes, FailsForAMissingFile) {
  EXPECT_EQ(VLIBCFileUTime("/tmp/absent", 3, &kTimes), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBCFileUTime(nullptr, 3, &kTimes), -1);
  EXPECT_EQ(VLIBCFileUTime(kFile, 3, nullptr), -1);
}

class FreeSpace : public SandboxTest {};

TEST_F(FreeSpace, IsThatOfAnOrdinaryUser) {
  SmallVolume volume("/tmp/volume", 16 << 20);
  WriteFile("/tmp/volume/file", std::string(100000, 'x'));
  EXPECT_EQ(VLIBGetFsAvailSize("/tmp/volume/file"), volume.Available());
  EXPECT_GT(volume.Available(), uint64_t{10} << 20);
  const uint64_t wanted = SmallVolume::PageSize() * 3;
  volume.SetAvailable(wanted);
  EXPECT_EQ(VLIBGetFsAvailSize("/tmp/volume"), wanted);
  volume.SetAvailable(0);
  EXPECT_EQ(VLIBGetFsAvailSize("/tmp/volume"), 0U);
}

TEST_F(FreeSpace, CountsMoreThanFourGigabytes) {
  SmallVolume volume("/tmp/volume", uint64_t{40} << 30);
  EXPECT_EQ(VLIBGetFsAvailSize("/tmp/volume"), volume.Available());
  EXPECT_GT(VLIBGetFsAvailSize("/tmp/volume"), uint64_t{39} << 30);
}

TEST_F(FreeSpace, IsZeroWhenUnknown) {
  EXPECT_EQ(VLIBGetFsAvailSize("/tmp/absent"), 0U);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBGetFsAvailSize(nullptr), 0U);
}

}  // namespace
}  // namespace vela_test
