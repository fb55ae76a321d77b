// Searching a file for a line.
#include <sys/stat.h>

#include <cerrno>
#include <string>
#include <vector>

#include "platform/forked_call.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace {

using vela_test::WriteFile;

constexpr const char* kFile = "/var/spool/queue";

int Find(const std::string& text, std::string* found = nullptr, size_t outSize = 4096) {
  std::vector<char> out(outSize + 1, '!');
  const int result = VLIBCFileGetLine(kFile, text.c_str(), out.data(), outSize, 1028);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  if (found != nullptr) *found = out.data();
  return result;
}

class LineSearch : public vela_test::SandboxTest {};

TEST_F(LineSearch, CopiesTheLineAndReturnsItsLength) {
  WriteFile(kFile, "/photo/a\n/photo/b\n/photo/c\n");
  for (const char* line : {"/photo/a", "/photo/b", "/photo/c"}) {
    std::string found;
    EXPECT_EQ(Find(line, &found), 8);
    EXPECT_EQ(found, line);
  }
}

TEST_F(LineSearch, TakesWholeLinesOnly) {
  WriteFile(kFile, "/photo/a/b\n x\nx \n/photo/abc\n");
  std::string found;
  EXPECT_EQ(Find("/photo/a", &found), 0);
  EXPECT_EQ(found, "");
  EXPECT_EQ(Find("photo/a/b"), 0);
  EXPECT_EQ(Find("x"), 0);
  EXPECT_EQ(Find("/PHOTO/ABC"), 0);
  EXPECT_EQ(Find("/photo/abc"), 10);
}

TEST_F(LineSearch, FindsALastLineWithoutNewline) {
  WriteFile(kFile, "a\nlast");
  EXPECT_EQ(Find("last"), 4);
  EXPECT_EQ(Find("las"), 0);
}

TEST_F(LineSearch, ComparesEveryByte) {
  const std::string line = "/p/\xff\xfe \r\t%s\x01";
  WriteFile(kFile, line + "\nwith\r\n" + std::string("n\0l\n", 4));
  EXPECT_EQ(Find(line), static_cast<int>(line.size()));
  EXPECT_EQ(Find("with"), 0);
  EXPECT_EQ(Find("with\r"), 5);
  EXPECT_EQ(Find("n"), 0);
}

TEST_F(LineSearch, DoesNotFindTextsOfSeveralLinesOrNone) {
  WriteFile(kFile, "a\nb\n\nc\n");
  EXPECT_EQ(Find("a\nb"), 0);
  EXPECT_EQ(Find("a\n"), 0);
  EXPECT_EQ(Find(""), 0);
}

TEST_F(LineSearch, IsZeroInAnEmptyFile) {
  WriteFile(kFile, "");
  EXPECT_EQ(Find("a"), 0);
}

TEST_F(LineSearch, IsMinusOneForAFileThatCannotBeRead) {
  std::string found = "x";
  EXPECT_EQ(Find("a", &found), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(found, "");
  vela_test::MakeDirectories(kFile);
  EXPECT_EQ(Find("a"), -1);
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
  char out[4];
  EXPECT_EQ(VLIBCFileGetLine(nullptr, "a", out, sizeof(out), 0), -1);
  EXPECT_EQ(VLIBCFileGetLine(kFile, nullptr, out, sizeof(out), 0), -1);
}

TEST_F(LineSearch, CutsTheCopyButNotTheLength) {
  WriteFile(kFile, "12345\n");
  std::string found;
  EXPECT_EQ(Find("12345", &found, 3), 5);
  EXPECT_EQ(found, "12");
  EXPECT_EQ(Find("12345", &found, 6), 5);
  EXPECT_EQ(found, "12345");
  EXPECT_EQ(VLIBCFileGetLine(kFile, "12345", nullptr, 0, 0), 5);
}

TEST_F(LineSearch, KnowsLinesAcrossAllBordersOfItsReads) {
  // Lines of lengths around powers of two, each unlike its neighbours in the last byte only.
  std::string content;
  std::vector<std::string> lines;
  for (const size_t length : {1U, 4095U, 4096U, 16383U, 32768U, 65535U, 65536U, 65537U, 200000U}) {
    lines.push_back(std::string(length, 'x') + "1");
    content += std::string(length, 'x') + "0\n" + lines.back() + "\n";
  }
  WriteFile(kFile, content);
  for (const std::string& line : lines) {
    EXPECT_EQ(Find(line), static_cast<int>(line.size()));
    EXPECT_EQ(Find(line + "1"), 0);
    EXPECT_EQ(Find(line.substr(0, line.size() - 1)), 0);
  }
}

TEST_F(LineSearch, DoesNotWaitForAPipe) {
  ASSERT_EQ(mkfifo(kFile, 0600), 0);
  EXPECT_EQ(Find("a"), 0);
}

TEST_F(LineSearch, LeavesNoDescriptorOpen) {
  WriteFile(kFile, "a\n");
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 10; ++i) {
    Find("a");
    Find("b");
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

}  // namespace
