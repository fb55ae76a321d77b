// Key/value files: reading, setting, crashes and concurrent writers.
#include <fcntl.h>
#include <sys/resource.h>

#include <csignal>

#include "platform/platform_fixture.h"
#include "support/descriptor.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

constexpr const char* kDirectory = "/var/spool";
constexpr const char* kFile = "/var/spool/values";
constexpr const char* kScratch = "/var/spool/values.replacement";

/// A value with the result of the call that read it.
struct Reading {
  int result;
  std::string value;
};

bool operator==(const Reading& a, const Reading& b) {
  return a.result == b.result && a.value == b.value;
}

void PrintTo(const Reading& reading, std::ostream* out) {
  *out << reading.result << " '" << reading.value << "'";
}

Reading Get(const std::string& key, size_t outSize = 4096) {
  std::vector<char> out(outSize + 1, '!');
  const int result = VLIBCFileGetKeyValue(kFile, key.c_str(), out.data(), outSize, 0);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return {result, std::string(out.data())};
}

int Set(const std::string& key, const std::string& value, const char* file = kFile) {
  return VLIBCFileSetKeyValue(file, key.c_str(), value.c_str(), 0);
}

int Check(const char* key, const std::string& value, const char* file = kFile) {
  return VLIBCFileCheckKeyValue(file, key, value.c_str(), 0);
}

/// A file and the values of its keys.
struct ReadCase : NamedCase {
  std::string content;
  std::vector<std::pair<std::string, Reading>> readings;
};

class KeyValueSyntax : public SandboxTest, public testing::WithParamInterface<ReadCase> {};

TEST_P(KeyValueSyntax, Reads) {
  WriteFile(kFile, GetParam().content);
  for (const auto& [key, reading] : GetParam().readings) EXPECT_EQ(Get(key), reading) << key;
}

const ReadCase kReadCases[] = {
    {"QuotedAndBareValues",
     "quoted=\"a b\"\nbare=c d\n",
     {{"quoted", {1, "a b"}}, {"bare", {1, "c d"}}}},
    {"EmptyValues",
     "quoted=\"\"\nbare=\nblank=   \n",
     {{"quoted", {1, ""}}, {"bare", {1, ""}}, {"blank", {1, ""}}}},
    {"AbsentKeys",
     "key=\"value\"\n",
     {{"other", {0, ""}}, {"ke", {0, ""}}, {"key2", {0, ""}}, {"KEY", {0, ""}}, {"", {0, ""}}}},
    {"WhiteSpaceAroundKeyAndEqualsSign",
     " \t a \t = \t \"1\"\n\tb=  2  \t\nc  =3\r\n",
     {{"a", {1, "1"}}, {"b", {1, "2"}}, {"c", {1, "3"}}}},
    {"WhiteSpaceInQuotes", "a=\"  1\t \"\n", {{"a", {1, "  1\t "}}}},
    {"BlankLinesAndComments",
     "\n   \n#a=\"1\"\n \t # a=\"2\"\na=\"3\"\n",
     {{"a", {1, "3"}}, {"#a", {0, ""}}}},
    {"LinesWithoutEqualsSign", "a\na \"1\"\na=\"2\"\n", {{"a", {1, "2"}}}},
    {"FirstOfTwoLinesWithTheKey", "a=\"first\"\na=\"second\"\n", {{"a", {1, "first"}}}},
    {"EscapesInQuotesOnly",
     R"(a="say \"x\" \\ \n"
b=say \"x\" \\
c="\\"
d="\\\""
)",
     {{"a", {1, R"(say "x" \ \n)"}},
      {"b", {1, R"(say \"x\" \\)"}},
      {"c", {1, "\\"}},
      {"d", {1, "\\\""}}}},
    {"BackslashThatEscapesNothing", "a=\"C:\\dir\\new\"\n", {{"a", {1, R"(C:\dir\new)"}}}},
    {"UnclosedQuoteAsBareValue", "a=\"open  \nb=\"\n", {{"a", {1, "\"open"}}, {"b", {1, "\""}}}},
    {"HashAndEqualsSignsInValues",
     "a=\"1#2=3\"\nb=1#2=3\n",
     {{"a", {1, "1#2=3"}}, {"b", {1, "1#2=3"}}}},
    {"LastLineWithoutNewline", "a=\"1\"\nb=\"2\"", {{"b", {1, "2"}}}},
};

INSTANTIATE_TEST_SUITE_P(KeyValueRead, KeyValueSyntax, testing::ValuesIn(kReadCases), CaseName());

class KeyValueRead : public SandboxTest {};

TEST_F(KeyValueRead, IsMinusOneForAFileThatCannotBeRead) {
  EXPECT_EQ(Get("key"), (Reading{-1, ""}));
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  MakeDirectories(kFile);
  EXPECT_EQ(Get("key"), (Reading{-1, ""}));
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
}

TEST_F(KeyValueRead, IsMinusOneWithoutReadPermission) {
  WriteFile(kFile, "key=\"value\"\n");
  ASSERT_EQ(chmod(kFile, 0200), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Get("key").result, -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
}

TEST_F(KeyValueRead, RefusesNullArguments) {
  char out[8] = "x";
  EXPECT_EQ(VLIBCFileGetKeyValue(nullptr, "key", out, sizeof(out), 0), -1);
  EXPECT_EQ(VLIBCFileGetKeyValue(kFile, nullptr, out, sizeof(out), 0), -1);
}

TEST_F(KeyValueRead, CutsAndTerminatesWhatDoesNotFit) {
  WriteFile(kFile, "a=\"12345\"\n");
  EXPECT_EQ(Get("a", 6), (Reading{1, "12345"}));
  EXPECT_EQ(Get("a", 5), (Reading{1, "1234"}));
  EXPECT_EQ(Get("a", 1), (Reading{1, ""}));
  char untouched = 'x';
  EXPECT_EQ(VLIBCFileGetKeyValue(kFile, "a", &untouched, 0, 0), 1);
  EXPECT_EQ(untouched, 'x');
}

TEST_F(KeyValueRead, ReadsLongLinesAndLargeFiles) {
  const std::string value(200000, 'v');
  WriteFile(kFile, std::string(100000, 'k') + "=\"1\"\na=\"" + value + "\"\nb=\"2\"\n");
  EXPECT_EQ(Get("a", 300000), (Reading{1, value}));
  EXPECT_EQ(Get("b"), (Reading{1, "2"}));
}

TEST_F(KeyValueRead, DoesNotWaitForAPipe) {
  ASSERT_EQ(mkfifo(kFile, 0600), 0);
  EXPECT_EQ(Get("a").result, 0);
}

class KeyValueCheck : public SandboxTest {};

TEST_F(KeyValueCheck, IsOneForExactlyThisValue) {
  WriteFile(kFile, "a=\"yes\"\nempty=\"\"\n");
  EXPECT_EQ(Check("a", "yes"), 1);
  EXPECT_EQ(Check("empty", ""), 1);
}

TEST_F(KeyValueCheck, IsZeroForAnythingElse) {
  WriteFile(kFile, "a=\"yes\"\n");
  for (const char* value : {"Yes", "yes ", "ye", ""}) EXPECT_EQ(Check("a", value), 0) << value;
  EXPECT_EQ(Check("b", "yes"), 0);
  EXPECT_EQ(Check("a", "yes", "/var/spool/absent"), 0);
  EXPECT_EQ(Check(nullptr, "yes"), 0);
}

TEST_F(KeyValueCheck, ComparesValuesOfAnyLengthAndByte) {
  const std::string longValue(10000, 'x');
  WriteFile(kFile, "long=\"" + longValue + "y\"\nnul=\"yes" + std::string(1, '\0') + "no\"\n");
  EXPECT_EQ(Check("long", longValue + "y"), 1);
  EXPECT_EQ(Check("long", longValue + "z"), 0);
  EXPECT_EQ(Check("nul", "yes"), 0);
}

/// The key "a" is set in a file.
struct SetCase : NamedCase {
  std::string before;
  const char* value;
  std::string after;
};

class KeyValueChange : public SandboxTest, public testing::WithParamInterface<SetCase> {};

TEST_P(KeyValueChange, KeepsTheRestOfTheFile) {
  WriteFile(kFile, GetParam().before);
  EXPECT_EQ(Set("a", GetParam().value), 0);
  EXPECT_EQ(ReadFile(kFile), GetParam().after);
}

std::string OddLines() {
  constexpr char kOdd[] = "\r\n\xff\xfe=\x01\r\nno pair at all\n\0nul\0=\0\n";
  return std::string(kOdd, sizeof(kOdd) - 1) + std::string(70000, 'l') + "\n\n";
}

const SetCase kSetCases[] = {
    {"FirstLineWithTheKeyOnly", "# head\nb=\"0\"\n a = 1 \na=\"2\"\nc=\"3\"\n", "9",
     "# head\nb=\"0\"\na=\"9\"\na=\"2\"\nc=\"3\"\n"},
    {"AbsentKey", "#a=\"0\"\nb=\"1\"\n", "2", "#a=\"0\"\nb=\"1\"\na=\"2\"\n"},
    {"AmongOddLines", OddLines() + "a=\"1\"\n" + OddLines(), "22",
     OddLines() + "a=\"22\"\n" + OddLines()},
    {"AfterALastLineWithoutNewline", "b=\"1\"", "2", "b=\"1\"\na=\"2\"\n"},
    {"BeforeALastLineWithoutNewline", "a=\"1\"\nb=\"2\"", "3", "a=\"3\"\nb=\"2\""},
};

INSTANTIATE_TEST_SUITE_P(KeyValueSet, KeyValueChange, testing::ValuesIn(kSetCases), CaseName());

class KeyValueSet : public SandboxTest {
 protected:
  static void ExpectOnlyTheFile() { EXPECT_EQ(ListDirectory(kDirectory), Strings{"values"}); }
};

TEST_F(KeyValueSet, MakesTheFileWithMode0644) {
  const mode_t mask = umask(077);
  EXPECT_EQ(Set("a", "1"), 0);
  umask(mask);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
  EXPECT_EQ(ModeOf(kFile), 0644);
  ExpectOnlyTheFile();
}

TEST_F(KeyValueSet, WritesValuesThatReadBackUnchanged) {
  std::string everyByte;
  for (int byte = 1; byte < 256; ++byte) {
    if (byte != '\n') everyByte += static_cast<char>(byte);
  }
  const std::string values[] = {
      "",  " ",     "\"", "\\",    "\\\"", "a\\",     "\\n",   "#",
      "=", "  x  ", "\r", "\"x\"", "x\"",  everyByte, "tab\t", std::string(5000, '"')};
  for (const std::string& value : values) {
    EXPECT_EQ(Set("first", "kept"), 0);
    EXPECT_EQ(Set("a", value), 0);
    EXPECT_EQ(Get("a", 20000), (Reading{1, value}));
    EXPECT_EQ(Get("first"), (Reading{1, "kept"}));
  }
}

TEST_F(KeyValueSet, RefusesTextThatDoesNotFitOnALine) {
  WriteFile(kFile, "a=\"1\"\n");
  EXPECT_EQ(Set("", "v"), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  for (const char* key : {"a=b", "a\nb", "#a", " a", "a\t", " "}) {
    EXPECT_EQ(Set(key, "v"), -1) << key;
  }
  for (const char* value : {"v\nw", "v\n"}) EXPECT_EQ(Set("a", value), -1) << value;
  EXPECT_EQ(VLIBCFileSetKeyValue(kFile, nullptr, "v", 0), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue(kFile, "a", nullptr, 0), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue(nullptr, "a", "v", 0), -1);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
  ExpectOnlyTheFile();
}

TEST_F(KeyValueSet, KeepsModeAndOwner) {
  WriteFile(kFile, "a=\"1\"\n");
  ASSERT_EQ(chmod(kFile, 0640), 0);
  // Without a second user in the sandbox, the owner does not change.
  const bool isOtherOwner = chown(kFile, 1, 1) == 0;
  ASSERT_TRUE(isOtherOwner || errno == EINVAL);
  struct stat before;
  ASSERT_EQ(stat(kFile, &before), 0);
  EXPECT_EQ(Set("a", "2"), 0);
  struct stat after;
  ASSERT_EQ(stat(kFile, &after), 0);
  EXPECT_EQ(after.st_mode, before.st_mode);
  EXPECT_EQ(after.st_uid, before.st_uid);
  EXPECT_EQ(after.st_gid, before.st_gid);
  EXPECT_NE(after.st_ino, before.st_ino) << "not replaced in one step";
}

TEST_F(KeyValueSet, KeepsAReaderOnTheOldFile) {
  WriteFile(kFile, "a=\"old\"\n");
  const vela_test::Descriptor reader(open(kFile, O_RDONLY | O_CLOEXEC));
  ASSERT_TRUE(reader.IsOpen());
  EXPECT_EQ(Set("a", "new"), 0);
  char text[64] = "";
  EXPECT_EQ(read(reader.Get(), text, sizeof(text) - 1), 8);
  EXPECT_STREQ(text, "a=\"old\"\n");
}

TEST_F(KeyValueSet, FailsWithoutTraceInAReadOnlyDirectory) {
  WriteFile("/var/spool/closed/values", "a=\"1\"\n");
  const ReadOnlyMount closed("/var/spool/closed");
  EXPECT_EQ(Set("a", "2", "/var/spool/closed/values"), -1);
  EXPECT_EQ(VLIBCErrGet(), EROFS);
  EXPECT_EQ(Set("a", "2", "/var/spool/closed/other"), -1);
  EXPECT_EQ(ReadFile("/var/spool/closed/values"), "a=\"1\"\n");
}

TEST_F(KeyValueSet, FailsForAFileThatMayNotBeWritten) {
  WriteFile(kFile, "a=\"1\"\n");
  ASSERT_EQ(chmod(kFile, 0444), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Set("a", "2"), -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
}

TEST_F(KeyValueSet, FailsForAnythingButARegularFile) {
  MakeDirectories("/var/spool/directory");
  EXPECT_EQ(Set("a", "1", "/var/spool/directory"), -1);
  ASSERT_EQ(mkfifo("/var/spool/fifo", 0600), 0);
  EXPECT_EQ(Set("a", "1", "/var/spool/fifo"), -1);
  EXPECT_EQ(Set("a", "1", "/var/spool/absent/file"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
}

TEST_F(KeyValueSet, KeepsTheOldFileOnAFullVolume) {
  SmallVolume volume("/var/spool/full", 1 << 20);
  const std::string path = "/var/spool/full/values";
  const std::string content = "a=\"" + std::string(100000, 'x') + "\"\n";
  WriteFile(path, content);
  volume.SetAvailable(0);
  EXPECT_EQ(Set("b", "1", path.c_str()), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOSPC);
  EXPECT_EQ(ReadFile(path), content);
  EXPECT_EQ(ListDirectory("/var/spool/full"), Strings{"values"});
}

TEST_F(KeyValueSet, RemovesItsScratchFileWhenAWriteFails) {
  WriteFile(kFile, "a=\"1\"\nb=\"" + std::string(5000, 'x') + "\"\n");
  const std::string before = ReadFile(kFile);
  InOwnProcess([] {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{100, 100};
    setrlimit(RLIMIT_FSIZE, &limit);
    EXPECT_EQ(Set("a", "2"), -1);
    EXPECT_EQ(VLIBCErrGet(), EFBIG);
  });
  EXPECT_EQ(ReadFile(kFile), before);
  ExpectOnlyTheFile();
}

TEST_F(KeyValueSet, FollowsALink) {
  WriteFile("/var/spool/real/target", "a=\"1\"\n");
  ASSERT_EQ(symlink("real/target", kFile), 0);
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile("/var/spool/real/target"), "a=\"2\"\n");
  struct stat link;
  ASSERT_EQ(lstat(kFile, &link), 0);
  EXPECT_TRUE(S_ISLNK(link.st_mode));
  EXPECT_EQ(ListDirectory("/var/spool/real"), Strings{"target"});
}

TEST_F(KeyValueSet, FailsForADanglingLink) {
  for (const char* target : {"/var/spool/absent/target", "nowhere"}) {
    ASSERT_EQ(symlink(target, kFile), 0);
    EXPECT_EQ(Set("a", "2"), -1) << target;
    ASSERT_EQ(unlink(kFile), 0);
  }
}

TEST_F(KeyValueSet, WaitsForTheLockOfAnotherProcess) {
  WriteFile(kFile, "a=\"1\"\n");
  const int result = RunAgainstLock(
      kFile, [] { return Set("a", "2"); }, [] { EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n"); });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, ChangesTheFileThatHasReplacedTheLockedOne) {
  WriteFile(kFile, "a=\"1\"\n");
  const int result = RunAgainstLock(
      kFile, [] { return Set("a", "2"); },
      [] {
        WriteFile("/var/spool/new", "a=\"5\"\nb=\"6\"\n");
        ASSERT_EQ(rename("/var/spool/new", kFile), 0);
      });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\nb=\"6\"\n");
}

TEST_F(KeyValueSet, MakesANewFileWhenTheLockedOneIsRemoved) {
  WriteFile(kFile, "b=\"1\"\n");
  const int result = RunAgainstLock(
      kFile, [] { return Set("a", "2"); }, [] { ASSERT_EQ(unlink(kFile), 0); });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, RemovesTheScratchFileOfAKilledWriter) {
  WriteFile(kFile, "a=\"1\"\n");
  WriteFile(kScratch, "half of a line");
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
  ExpectOnlyTheFile();

  WriteFile("/var/spool/other.replacement", "half");
  EXPECT_EQ(Set("a", "1", "/var/spool/other"), 0);
  EXPECT_EQ(ReadFile("/var/spool/other"), "a=\"1\"\n");
}

TEST_F(KeyValueSet, KeepsTheScratchFileOfARunningWriter) {
  WriteFile(kFile, "a=\"1\"\n");
  const int result = RunAgainstLock(
      kScratch, [] { return Set("a", "2"); },
      [] { ASSERT_EQ(rename(kScratch, "/var/spool/moved"), 0); });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
  EXPECT_EQ(ReadFile("/var/spool/moved"), "");
}

TEST_F(KeyValueSet, NeverWritesThroughALinkAtTheScratchName) {
  WriteFile(kFile, "a=\"1\"\n");
  WriteFile("/var/spool/precious", "untouched");
  ASSERT_EQ(symlink("precious", kScratch), 0);
  EXPECT_EQ(Set("a", "2"), -1);
  EXPECT_EQ(ReadFile("/var/spool/precious"), "untouched");
  ASSERT_EQ(unlink(kScratch), 0);
  ASSERT_EQ(link("/var/spool/precious", kScratch), 0);
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile("/var/spool/precious"), "untouched");
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, LosesNoKeyOfSeveralWriters) {
  constexpr int kWriters = 6;
  constexpr int kRounds = 60;
  std::vector<pid_t> writers;
  for (int writer = 0; writer < kWriters; ++writer) {
    writers.push_back(Fork([writer] {
      // This writer's own counter, which no other writer sets, must never be seen going back.
      const std::string counter = "counter" + std::to_string(writer);
      for (int round = 0; round < kRounds; ++round) {
        const std::string number = std::to_string(round);
        if (Set("k" + std::to_string(writer) + "_" + number, number) != 0) return 1;
        const Reading seen = Get(counter);
        if (seen.result == 0 ? round != 0 : seen.value != number) return 2;
        if (Set(counter, std::to_string(round + 1)) != 0) return 3;
      }
      return 0;
    }));
  }
  for (const pid_t writer : writers) EXPECT_EQ(Join(writer), 0);
  EXPECT_EQ(ReadLines(kFile).size(), size_t{kWriters * (kRounds + 1)});
  for (int writer = 0; writer < kWriters; ++writer) {
    EXPECT_EQ(Get("counter" + std::to_string(writer)), (Reading{1, std::to_string(kRounds)}));
  }
  ExpectOnlyTheFile();
}

TEST_F(KeyValueSet, LetsReadersSeeWholeFilesOnly) {
  WriteFile(kFile, "filler=\"" + std::string(20000, 'f') + "\"\na=\"0\"\nend=\"here\"\n");
  const pid_t writer = Fork([] {
    for (int i = 0; i < 300; ++i) {
      if (Set("a", std::to_string(i)) != 0) return 1;
    }
    return 0;
  });
  for (int i = 0; i < 300; ++i) ASSERT_EQ(Check("end", "here"), 1);
  EXPECT_EQ(Join(writer), 0);
}

TEST_F(KeyValueSet, SurvivesWritersThatAreKilled) {
  WriteFile(kFile, "kept=\"yes\"\n");
  for (int round = 0; round < 30; ++round) {
    const pid_t writer = Fork([] {
      for (int i = 0;; ++i) Set("a", std::to_string(i));
      return 0;
    });
    usleep(static_cast<useconds_t>(500 + round * 137));
    kill(writer, SIGKILL);
    EXPECT_EQ(Join(writer), -SIGKILL);
    ASSERT_EQ(Check("kept", "yes"), 1);
  }
  EXPECT_EQ(Set("b", "1"), 0);
  ExpectOnlyTheFile();
}

TEST_F(KeyValueSet, KeepsTheKeysOfAllThatMakeTheFileAtOnce) {
  for (int round = 0; round < 20; ++round) {
    RemoveTree(kFile);
    std::vector<pid_t> writers;
    for (int writer = 0; writer < 5; ++writer) {
      writers.push_back(Fork([writer] { return Set(std::to_string(writer), "x"); }));
    }
    for (const pid_t writer : writers) ASSERT_EQ(Join(writer), 0);
    ASSERT_EQ(ReadLines(kFile).size(), 5U);
  }
}

TEST_F(KeyValueSet, LeavesNoDescriptorOpen) {
  ASSERT_EQ(Set("a", "1"), 0);
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 20; ++i) {
      Set("a", "2");
      Get("a");
      Set("a", "1", kDirectory);
      Check("a", "2");
    }
  });
}

}  // namespace
}  // namespace vela_test
