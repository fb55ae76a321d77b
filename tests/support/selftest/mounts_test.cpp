// Small, full and read-only volumes.
#include "support/mounts.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>

#include "support/descriptor.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

class MountsTest : public SandboxTest {};

/// errno of writing `bytes` to a new file, 0 when all were written.
int WriteError(const std::string& path, size_t bytes) {
  const Descriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0666));
  if (!file.IsOpen()) {
    return errno;
  }
  const std::string content(bytes, 'x');
  const ssize_t written = write(file.Get(), content.data(), content.size());
  return written == static_cast<ssize_t>(bytes) ? 0 : errno;
}

TEST_F(MountsTest, SmallVolumeHasExactlyTheSpaceAskedFor) {
  const SmallVolume volume("/tmp/volume", 0x40000000);
  EXPECT_EQ(volume.Available(), 0x40000000U);
  struct statvfs status {};
  ASSERT_EQ(statvfs("/tmp/volume", &status), 0);
  EXPECT_EQ(status.f_bavail * status.f_frsize, 0x40000000U);
}

TEST_F(MountsTest, AvailableSpaceCanBeSet) {
  SmallVolume volume("/tmp/volume", 1 << 20);
  WriteFileOfSize("/tmp/volume/photo", 10000);
  volume.SetAvailable(0x40000000);
  EXPECT_EQ(volume.Available(), 0x40000000U);
  volume.SetAvailable(0x40000000 - SmallVolume::PageSize());
  EXPECT_EQ(volume.Available(), 0x40000000U - SmallVolume::PageSize());
}

TEST_F(MountsTest, FullVolumeRefusesWrites) {
  SmallVolume volume("/tmp/volume", 1 << 20);
  WriteFileOfSize("/tmp/volume/photo", 10000);
  EXPECT_EQ(WriteError("/tmp/volume/before", 100), 0);
  volume.SetAvailable(0);
  EXPECT_EQ(WriteError("/tmp/volume/after", 100), ENOSPC);
}

TEST_F(MountsTest, SmallVolumeEndsWithItsObject) {
  {
    const SmallVolume volume("/tmp/volume", 1 << 20);
    WriteFile("/tmp/volume/file", "x");
  }
  EXPECT_TRUE(ListDirectory("/tmp/volume").empty());
}

TEST_F(MountsTest, ReadOnlyMountRefusesChanges) {
  WriteFile("/tmp/d/file", "x");
  {
    const ReadOnlyMount mount("/tmp/d");
    EXPECT_EQ(WriteError("/tmp/d/new", 1), EROFS);
    EXPECT_EQ(chmod("/tmp/d/file", 0600), -1);
    EXPECT_EQ(errno, EROFS);
    EXPECT_EQ(ReadFile("/tmp/d/file"), "x");
    EXPECT_EQ(WriteError("/tmp/elsewhere", 1), 0);
  }
  EXPECT_EQ(WriteError("/tmp/d/new", 1), 0);
}

TEST_F(MountsTest, SystemDirectoriesCanBeReadOnly) {
  for (const std::string place : {"/var/run", "/var/spool", "/etc", "/var/lib", "/usr/vela/bin"}) {
    {
      const ReadOnlyMount mount(place);
      EXPECT_EQ(WriteError(place + "/file", 1), EROFS) << place;
    }
    EXPECT_EQ(WriteError(place + "/file", 1), 0) << place;
  }
}

TEST_F(MountsTest, ObjectsThatOutliveAResetLeaveTheSandboxWhole) {
  {
    const ReadOnlyMount tmp("/tmp");
    ResetSandbox();
  }
  WriteFile("/tmp/file", "x");
  ResetSandbox();
  EXPECT_FALSE(Exists("/tmp/file"));
}

TEST_F(MountsTest, ResetUnmountsLeftoverMounts) {
  const SmallVolume volume("/var/spool/volume", 1 << 20);
  const SmallVolume database("/var/lib/velaindex", 1 << 20);
  const ReadOnlyMount etc("/etc");
  const ReadOnlyMount tmp("/tmp");
  ResetSandbox();
  EXPECT_FALSE(Exists("/var/spool/volume"));
  EXPECT_FALSE(Exists("/var/lib/velaindex"));
  EXPECT_EQ(WriteError("/etc/file", 1), 0);
  EXPECT_EQ(WriteError("/tmp/file", 1), 0);
}

}  // namespace
}  // namespace vela_test
