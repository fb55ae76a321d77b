// The error of the last platform failure.
#include <cerrno>
#include <cstring>
#include <string>
#include <thread>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/sandbox.h"

namespace {

using ErrorState = vela_test::SandboxTest;

TEST_F(ErrorState, HoldsTheCodeOfTheLastFailure) {
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);

  char value[8];
  ASSERT_EQ(VLIBCFileGetKeyValue("/tmp", "key", value, sizeof(value), 0), -1);
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
}

TEST_F(ErrorState, NamesTheSourceFileWithoutItsDirectory) {
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  EXPECT_STREQ(VLIBCErrorGetFile(), "file_status.cpp");
  EXPECT_GT(VLIBCErrorGetLine(), 0);

  char directory[64];
  ASSERT_EQ(VELAEADirPath(0, "", directory, sizeof(directory)), -1);
  EXPECT_STREQ(VLIBCErrorGetFile(), "metadata_files.cpp");
}

TEST_F(ErrorState, StaysAfterASuccess) {
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  const int line = VLIBCErrorGetLine();
  ASSERT_EQ(VLIBCFileStat("/tmp", 9, &status), 0);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBCErrorGetLine(), line);
}

TEST_F(ErrorState, IsEmptyInAThreadWithoutFailure) {
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  int code = -1;
  int line = -1;
  std::string file = "unset";
  std::thread([&] {
    code = VLIBCErrGet();
    line = VLIBCErrorGetLine();
    file = VLIBCErrorGetFile();
  }).join();
  EXPECT_EQ(code, 0);
  EXPECT_EQ(line, 0);
  EXPECT_EQ(file, "");
}

TEST_F(ErrorState, IsNotTouchedByFailuresOfOtherThreads) {
  VLIBCFileStatus status;
  ASSERT_EQ(VLIBCFileStat("/tmp/absent", 9, &status), -1);
  std::thread([] {
    VLIBCFileStatus other;
    VLIBCFileStat("/dev/null/below", 9, &other);
  }).join();
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
}

}  // namespace
