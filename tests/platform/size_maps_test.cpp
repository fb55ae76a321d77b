// Size maps and the settings they come from.
#include <unistd.h>

#include <cerrno>
#include <string>
#include <thread>
#include <vector>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

using vela_test::WriteFile;

constexpr const char* kSettings = "/etc/velainfo.conf";

int32_t MapOf(int kind) {
  int32_t file = -5;
  int32_t directory = -5;
  EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", kind, &file), 0);
  EXPECT_EQ(VELAIDX_GetDirThumbSizeMap("/photo", kind, &directory), 0);
  EXPECT_EQ(file, directory);
  return file;
}

class SizeMaps : public vela_test::SandboxTest {};

TEST_F(SizeMaps, HoldAllClassesWithoutSetting) {
  EXPECT_EQ(MapOf(1), 63);
  EXPECT_EQ(MapOf(2), 63);
  WriteFile(kSettings, "other=\"1\"\n");
  EXPECT_EQ(MapOf(1), 63);
}

TEST_F(SizeMaps, HaveASettingForEachKind) {
  WriteFile(kSettings, "photo_thumb_size_map=\"18\"\nvideo_thumb_size_map=5\n");
  EXPECT_EQ(MapOf(1), 18);
  EXPECT_EQ(MapOf(2), 5);
}

TEST_F(SizeMaps, TakeEveryNumberFromZeroTo63) {
  for (int map = 0; map <= 63; ++map) {
    WriteFile(kSettings, "photo_thumb_size_map=\"" + std::to_string(map) + "\"\n");
    ASSERT_EQ(MapOf(1), map);
  }
}

TEST_F(SizeMaps, HoldAllClassesForAnyOtherValue) {
  for (const char* value : {"64", "-1", "", "x", "0x10", "1x", "1 2", " 7", "+7", "1.0", "6e0",
                            "4294967297", "18446744073709551617", "99999999999999999999999"}) {
    WriteFile(kSettings, std::string("photo_thumb_size_map=\"") + value + "\"\n");
    EXPECT_EQ(MapOf(1), 63) << value;
  }
}

TEST_F(SizeMaps, FollowEveryChangeOfTheFile) {
  // Same size and, on a coarse clock, the same time: only the content tells.
  for (int i = 0; i < 200; ++i) {
    const int map = 10 + i % 50;
    WriteFile(kSettings, "photo_thumb_size_map=\"" + std::to_string(map) + "\"\n");
    ASSERT_EQ(MapOf(1), map);
  }
}

TEST_F(SizeMaps, FollowAChangeAfterALongRest) {
  WriteFile(kSettings, "photo_thumb_size_map=\"11\"\n");
  usleep(150000);
  EXPECT_EQ(MapOf(1), 11);
  EXPECT_EQ(MapOf(1), 11);
  WriteFile(kSettings, "photo_thumb_size_map=\"12\"\n");
  EXPECT_EQ(MapOf(1), 12);
  WriteFile(kSettings, "");
  EXPECT_EQ(MapOf(1), 63);
}

TEST_F(SizeMaps, AreUnknownForOtherKinds) {
  for (const int kind : {0, 3, -1, 1000}) {
    int32_t map = -5;
    EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", kind, &map), -1);
    EXPECT_EQ(VLIBCErrGet(), EINVAL);
    EXPECT_EQ(VELAIDX_GetDirThumbSizeMap("/photo", kind, &map), -1);
    EXPECT_EQ(map, -5);
  }
  EXPECT_EQ(VELAIDX_GetThumbSizeMap("/photo/a.jpg", 1, nullptr), -1);
}

TEST_F(SizeMaps, CanBeAskedForFromSeveralThreads) {
  WriteFile(kSettings, "photo_thumb_size_map=\"10\"\n");
  usleep(150000);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int round = 0; round < 5000; ++round) EXPECT_EQ(MapOf(1), 10);
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
