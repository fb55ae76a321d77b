// Searching a large file for many lines: it is read once, and every change is noticed.
#include <fcntl.h>

#include <atomic>
#include <cstdio>

#include "platform/platform_fixture.h"
#include "support/descriptor.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr const char* kFile = "/var/spool/queue";

int Find(const std::string& text, const std::string& file = kFile) {
  return VLIBCFileGetLine(file.c_str(), text.c_str(), nullptr, 0, 1028);
}

bool Has(const std::string& text, const std::string& file = kFile) {
  const int result = Find(text, file);
  EXPECT_TRUE(result == 0 || result == static_cast<int>(text.size())) << text << ": " << result;
  return result > 0;
}

std::string Line(int number) {
  char line[32];
  std::snprintf(line, sizeof(line), "/photo/%08d", number);
  return line;
}

/// The text of a file of numbered lines.
std::string Lines(int count) {
  std::string content;
  for (int i = 0; i < count; ++i) content += Line(i) + "\n";
  return content;
}

/// Bytes that this process has read from files so far.
long long BytesRead() {
  long long bytes = -1;
  std::sscanf(ReadFile("/proc/self/io").c_str(), "rchar: %lld", &bytes);
  return bytes;
}

/// Waits until the file is old enough to be recognised by its times.
void WaitUntilSettled() {
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
}

void ChangeInPlace(off_t offset, const std::string& bytes) {
  const vela_test::Descriptor file(open(kFile, O_WRONLY | O_CLOEXEC));
  ASSERT_EQ(pwrite(file.Get(), bytes.data(), bytes.size(), offset),
            static_cast<ssize_t>(bytes.size()));
}

constexpr int kLineCount = 20000;
constexpr int kLineSize = 16;  // "/photo/00000000" and the newline

/// A large file that has not changed for a while and has been searched before.
class LargeFile : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kFile, Lines(kLineCount));
    WaitUntilSettled();
    ASSERT_TRUE(Has(Line(0)));
    ASSERT_FALSE(Has(Line(kLineCount)));
  }
};

TEST_F(LargeFile, IsReadOnceForManySearches) {
  WriteFile(kFile, Lines(kLineCount));
  WaitUntilSettled();
  const long long before = BytesRead();
  for (int i = 0; i < kLineCount; i += 20) {
    ASSERT_TRUE(Has(Line(i)));
    ASSERT_FALSE(Has(Line(i) + "x"));
    ASSERT_FALSE(Has(Line(i + kLineCount)));
  }
  const long long size = static_cast<long long>(kLineCount) * kLineSize;
  EXPECT_LT(BytesRead() - before, 2 * size);
}

TEST_F(LargeFile, FindsWholeLinesOnly) {
  for (const char* line : {"/photo/00000000", "/photo/00019999"}) EXPECT_TRUE(Has(line)) << line;
  for (const char* other :
       {"/photo/0000000", "photo/00000000", "/photo/000000000", "/PHOTO/00000000",
        "/photo/00000000\n", "/photo/00000000\n/photo/00000001"}) {
    EXPECT_FALSE(Has(other)) << other;
  }
  EXPECT_EQ(Find(""), 0);
}

TEST_F(LargeFile, CopiesTheLineAndReturnsItsLength) {
  char out[8] = "xxxxxxx";
  EXPECT_EQ(VLIBCFileGetLine(kFile, "/photo/00000001", out, sizeof(out), 0), 15);
  EXPECT_STREQ(out, "/photo/");
  EXPECT_EQ(VLIBCFileGetLine(kFile, "/photo/x", out, sizeof(out), 0), 0);
  EXPECT_STREQ(out, "");
}

TEST_F(LargeFile, FindsALastLineWithoutNewline) {
  AppendToFile(kFile, "last");
  WaitUntilSettled();
  EXPECT_TRUE(Has("last"));
  EXPECT_TRUE(Has("last")) << "the second time";
  EXPECT_FALSE(Has("las"));
  EXPECT_FALSE(Has("lastx"));
}

TEST_F(LargeFile, FindsLinesOfAllLengthsAndBytes) {
  std::string content = Lines(kLineCount) + "\n\nwith\r\n" + std::string("n\0l\n", 4);
  std::vector<std::string> lines = {"/p/\xff\xfe \r\t%s\x01"};
  for (const size_t length : {1U, 4095U, 4096U, 65535U, 65536U, 65537U, 131072U, 200000U}) {
    lines.push_back(std::string(length, 'x') + "1");
  }
  for (const std::string& line : lines) content += line + "\n";
  WriteFile(kFile, content);
  WaitUntilSettled();
  for (int round = 0; round < 2; ++round) {
    for (const std::string& line : lines) {
      EXPECT_TRUE(Has(line)) << line.size();
      EXPECT_FALSE(Has(line + "1")) << line.size();
      EXPECT_FALSE(Has(line.substr(0, line.size() - 1))) << line.size();
    }
    EXPECT_TRUE(Has("with\r"));
    EXPECT_FALSE(Has("with"));
    EXPECT_FALSE(Has("n"));
    EXPECT_EQ(Find(""), 0);
  }
}

TEST_F(LargeFile, ShowsAnAppendedLineAtOnce) {
  AppendToFile(kFile, "/photo/new\n");
  EXPECT_TRUE(Has("/photo/new"));
  EXPECT_TRUE(Has(Line(0)));
}

TEST_F(LargeFile, ShowsAChangeOfTheSameSizeAtOnce) {
  ChangeInPlace(5 * kLineSize, "/photo/changed!");
  EXPECT_TRUE(Has("/photo/changed!"));
  EXPECT_FALSE(Has(Line(5)));
  EXPECT_TRUE(Has(Line(6)));
}

TEST_F(LargeFile, ShowsAChangeWhoseTimeWasSetBack) {
  const FileTime time = ModificationTime(kFile);
  ChangeInPlace(5 * kLineSize, "/photo/changed!");
  SetFileTime(kFile, time.seconds, time.nanoseconds);
  ASSERT_EQ(ModificationTime(kFile), time);
  EXPECT_TRUE(Has("/photo/changed!"));
  EXPECT_FALSE(Has(Line(5)));
}

TEST_F(LargeFile, ShowsEveryOneOfManyQuickChanges) {
  for (int i = 0; i < 50; ++i) {
    const std::string line = "/photo/turn" + std::to_string(1000 + i);
    ChangeInPlace(5 * kLineSize, line);
    ASSERT_TRUE(Has(line));
    ASSERT_FALSE(Has("/photo/turn" + std::to_string(999 + i)));
  }
}

TEST_F(LargeFile, IsReadAgainAfterItsReplacement) {
  std::string content = Lines(kLineCount);
  content.replace(0, 15, "/photo/replaced");
  WriteFile("/var/spool/replacement", content);
  const FileTime time = ModificationTime(kFile);
  SetFileTime("/var/spool/replacement", time.seconds, time.nanoseconds);
  ASSERT_EQ(rename("/var/spool/replacement", kFile), 0);
  EXPECT_TRUE(Has("/photo/replaced"));
  EXPECT_FALSE(Has(Line(0)));
}

TEST_F(LargeFile, IsReadAgainAfterItsTruncation) {
  ASSERT_EQ(truncate(kFile, (kLineCount - 1) * kLineSize), 0);
  EXPECT_FALSE(Has(Line(kLineCount - 1)));
  ASSERT_EQ(truncate(kFile, kLineSize), 0);
  EXPECT_TRUE(Has(Line(0)));
  EXPECT_FALSE(Has(Line(1)));
  ASSERT_EQ(truncate(kFile, 0), 0);
  EXPECT_FALSE(Has(Line(0)));
}

TEST_F(LargeFile, IsNotFoundAfterItsRemoval) {
  ASSERT_EQ(unlink(kFile), 0);
  EXPECT_EQ(Find(Line(0)), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  WriteFile(kFile, "/other\n");
  EXPECT_FALSE(Has(Line(0)));
}

TEST_F(LargeFile, CannotBeSearchedWithoutReadPermission) {
  ASSERT_EQ(chmod(kFile, 0), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Find(Line(0)), -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
  EXPECT_EQ(Find("/nowhere"), -1);
}

TEST_F(LargeFile, IsOneOfMany) {
  std::vector<std::string> files;
  for (int i = 0; i < 9; ++i) {
    files.push_back(std::string(kFile) + std::to_string(i));
    WriteFile(files.back(), Lines(5000) + "/only/in/" + std::to_string(i) + "\n");
  }
  WaitUntilSettled();
  for (int round = 0; round < 3; ++round) {
    for (int i = 0; i < 9; ++i) {
      for (int line = 0; line < 9; ++line) {
        EXPECT_EQ(Has("/only/in/" + std::to_string(line), files[i]), i == line);
      }
    }
  }
}

TEST_F(LargeFile, MayBeSearchedFromSeveralThreadsWhileItChanges) {
  std::atomic<int> misses = 0;
  std::thread searching([&misses] {
    RunInThreads(4, [&misses](int) {
      for (int i = 0; i < 300; ++i) {
        // Line 5 changes, all others stay.
        if (Find(Line(10 + i)) != 15 || Find("/nowhere") != 0) ++misses;
      }
    });
  });
  for (int i = 0; i < 5; ++i) {
    ChangeInPlace(5 * kLineSize, "/photo/change" + std::to_string(10 + i));
    std::this_thread::sleep_for(std::chrono::milliseconds(30));
  }
  searching.join();
  EXPECT_EQ(misses, 0);
}

TEST_F(LargeFile, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 10; ++i) {
      Has(Line(i));
      Has("/nowhere");
      AppendToFile(kFile, "x\n");
      Has(Line(i));
    }
  });
}

class SearchedFile : public SandboxTest {};

TEST_F(SearchedFile, IsSearchedCorrectlyAtSizesAroundTheLimitForAnIndex) {
  for (const int size : {65535, 65536, 65537, 131072}) {
    std::string content = Lines(size / kLineSize + 1);
    content.resize(static_cast<size_t>(size) - 4);
    WriteFile(kFile, content + "\nend");
    for (int round = 0; round < 2; ++round) {
      EXPECT_TRUE(Has("end")) << size;
      EXPECT_TRUE(Has(Line(0))) << size;
      EXPECT_FALSE(Has("en")) << size;
      WaitUntilSettled();
    }
  }
}

TEST_F(SearchedFile, MayHaveTooManyLinesForAnIndex) {
  std::string content((size_t{8} << 20) + 10, '\n');
  content.replace(0, 6, "first\n");
  WriteFile(kFile, content + "/last\n");
  WaitUntilSettled();
  for (int round = 0; round < 2; ++round) {
    EXPECT_TRUE(Has("first"));
    EXPECT_TRUE(Has("/last"));
    EXPECT_FALSE(Has("/las"));
  }
}

TEST_F(SearchedFile, WithTooManyLinesIsReadOnceForEachSearchAfterTheFirst) {
  const std::string content((size_t{8} << 20) + 10, '\n');
  WriteFile(kFile, content + "/last\n");
  WaitUntilSettled();
  ASSERT_FALSE(Has("/nowhere"));
  const auto size = static_cast<long long>(content.size());
  for (int question = 0; question < 3; ++question) {
    const long long before = BytesRead();
    EXPECT_TRUE(Has("/last"));
    EXPECT_FALSE(Has("/nowhere"));
    const long long read = BytesRead() - before;
    EXPECT_GE(read, 2 * size) << "bytes are not counted";
    EXPECT_LT(read, 2 * size + size / 4);
  }
}

TEST_F(SearchedFile, WithTooManyLinesIsIndexedOnceTheyAreFewer) {
  const std::string content((size_t{8} << 20) + 10, '\n');
  WriteFile(kFile, content);
  WaitUntilSettled();
  ASSERT_FALSE(Has("/nowhere"));
  WriteFile(kFile, Lines(kLineCount));
  WaitUntilSettled();
  ASSERT_TRUE(Has(Line(7)));
  const long long before = BytesRead();
  EXPECT_FALSE(Has("/nowhere"));
  EXPECT_TRUE(Has(Line(8)));
  EXPECT_LT(BytesRead() - before, kLineCount * kLineSize / 4);
}

TEST_F(SearchedFile, IsDistinguishedFromACopyWithAnotherName) {
  WriteFile(kFile, Lines(kLineCount));
  WaitUntilSettled();
  ASSERT_TRUE(Has(Line(0)));
  ASSERT_EQ(link(kFile, "/var/spool/second"), 0);
  EXPECT_TRUE(Has(Line(0), "/var/spool/second"));
  ASSERT_EQ(unlink(kFile), 0);
  EXPECT_EQ(Find(Line(0)), -1);
  EXPECT_TRUE(Has(Line(1), "/var/spool/second"));
}

}  // namespace
}  // namespace vela_test
