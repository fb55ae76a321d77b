// Searching a file for a line.
#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kFile = "/var/spool/queue";

/// The result of the call and the line it has copied.
using Found = std::pair<int, std::string>;

Found Find(const std::string& text, size_t outSize = 4096) {
  std::vector<char> out(outSize + 1, '!');
  const int result = VLIBCFileGetLine(kFile, text.c_str(), out.data(), outSize, 1028);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return {result, out.data()};
}

const Found kNotFound = {0, ""};
const Found kUnreadable = {-1, ""};

class LineSearch : public SandboxTest {};

TEST_F(LineSearch, CopiesTheLineAndReturnsItsLength) {
  WriteFile(kFile, "/photo/a\n/photo/b\n/photo/c\n");
  for (const char* line : {"/photo/a", "/photo/b", "/photo/c"}) {
    EXPECT_EQ(Find(line), Found(8, line));
  }
}

TEST_F(LineSearch, TakesWholeLinesOnly) {
  WriteFile(kFile, "/photo/a/b\n x\nx \n/photo/abc\n");
  for (const char* part : {"/photo/a", "photo/a/b", "x", "/PHOTO/ABC"}) {
    EXPECT_EQ(Find(part), kNotFound) << part;
  }
  EXPECT_EQ(Find("/photo/abc"), Found(10, "/photo/abc"));
}

TEST_F(LineSearch, FindsALastLineWithoutNewline) {
  WriteFile(kFile, "a\nlast");
  EXPECT_EQ(Find("last"), Found(4, "last"));
  EXPECT_EQ(Find("las"), kNotFound);
}

TEST_F(LineSearch, ComparesEveryByte) {
  const std::string line = "/p/\xff\xfe \r\t%s\x01";
  WriteFile(kFile, line + "\nwith\r\n" + std::string("n\0l\n", 4));
  EXPECT_EQ(Find(line).first, static_cast<int>(line.size()));
  EXPECT_EQ(Find("with"), kNotFound);
  EXPECT_EQ(Find("with\r"), Found(5, "with\r"));
  EXPECT_EQ(Find("n"), kNotFound);
}

TEST_F(LineSearch, DoesNotFindTextsOfSeveralLinesOrNone) {
  WriteFile(kFile, "a\nb\n\nc\n");
  for (const char* text : {"a\nb", "a\n", ""}) EXPECT_EQ(Find(text), kNotFound) << text;
}

TEST_F(LineSearch, IsZeroInAnEmptyFile) {
  WriteFile(kFile, "");
  EXPECT_EQ(Find("a"), kNotFound);
}

TEST_F(LineSearch, IsMinusOneForAFileThatCannotBeRead) {
  EXPECT_EQ(Find("a"), kUnreadable);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  MakeDirectories(kFile);
  EXPECT_EQ(Find("a"), kUnreadable);
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
  char out[4];
  EXPECT_EQ(VLIBCFileGetLine(nullptr, "a", out, sizeof(out), 0), -1);
  EXPECT_EQ(VLIBCFileGetLine(kFile, nullptr, out, sizeof(out), 0), -1);
}

TEST_F(LineSearch, CutsTheCopyButNotTheLength) {
  WriteFile(kFile, "12345\n");
  EXPECT_EQ(Find("12345", 3), Found(5, "12"));
  EXPECT_EQ(Find("12345", 6), Found(5, "12345"));
  EXPECT_EQ(VLIBCFileGetLine(kFile, "12345", nullptr, 0, 0), 5);
}

TEST_F(LineSearch, FindsLinesAcrossTheBordersOfItsReads) {
  // Lines of lengths around powers of two, each different from its neighbours in the last byte
  // only.
  std::string content;
  std::vector<std::string> lines;
  for (const size_t length : {1U, 4095U, 4096U, 16383U, 32768U, 65535U, 65536U, 65537U, 200000U}) {
    lines.push_back(std::string(length, 'x') + "1");
    content += std::string(length, 'x') + "0\n" + lines.back() + "\n";
  }
  WriteFile(kFile, content);
  for (const std::string& line : lines) {
    EXPECT_EQ(Find(line).first, static_cast<int>(line.size()));
    EXPECT_EQ(Find(line + "1"), kNotFound);
    EXPECT_EQ(Find(line.substr(0, line.size() - 1)), kNotFound);
  }
}

TEST_F(LineSearch, DoesNotWaitForAPipe) {
  ASSERT_EQ(mkfifo(kFile, 0600), 0);
  EXPECT_EQ(Find("a"), kNotFound);
}

TEST_F(LineSearch, LeavesNoDescriptorOpen) {
  WriteFile(kFile, "a\n");
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 10; ++i) {
      Find("a");
      Find("b");
    }
  });
}

}  // namespace
}  // namespace vela_test
