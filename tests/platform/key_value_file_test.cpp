// Key/value files: reading, setting, what a crash or a second writer does.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <string>
#include <vector>

#include "platform/forked_call.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/privileges.h"
#include "support/sandbox.h"

namespace {

using vela_test::ListDirectory;
using vela_test::ModeOf;
using vela_test::ReadFile;
using vela_test::WriteFile;

constexpr const char* kFile = "/var/spool/values";

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

Reading Get(const char* key, size_t outSize = 4096) {
  std::vector<char> out(outSize + 1, '!');
  const int result = VLIBCFileGetKeyValue(kFile, key, out.data(), outSize, 0);
  EXPECT_EQ(out[outSize], '!') << "written beyond the buffer";
  return {result, std::string(out.data())};
}

class KeyValueRead : public vela_test::SandboxTest {};

TEST_F(KeyValueRead, FindsQuotedAndBareValues) {
  WriteFile(kFile, "quoted=\"a b\"\nbare=c d\n");
  EXPECT_EQ(Get("quoted"), (Reading{1, "a b"}));
  EXPECT_EQ(Get("bare"), (Reading{1, "c d"}));
}

TEST_F(KeyValueRead, IsOneAlsoForAnEmptyValue) {
  WriteFile(kFile, "quoted=\"\"\nbare=\nblank=   \n");
  EXPECT_EQ(Get("quoted"), (Reading{1, ""}));
  EXPECT_EQ(Get("bare"), (Reading{1, ""}));
  EXPECT_EQ(Get("blank"), (Reading{1, ""}));
}

TEST_F(KeyValueRead, IsZeroForAnAbsentKey) {
  WriteFile(kFile, "key=\"value\"\n");
  EXPECT_EQ(Get("other"), (Reading{0, ""}));
  EXPECT_EQ(Get("ke"), (Reading{0, ""}));
  EXPECT_EQ(Get("key2"), (Reading{0, ""}));
  EXPECT_EQ(Get("KEY"), (Reading{0, ""}));
  EXPECT_EQ(Get(""), (Reading{0, ""}));
}

TEST_F(KeyValueRead, IsMinusOneForAFileThatCannotBeRead) {
  EXPECT_EQ(Get("key"), (Reading{-1, ""}));
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  vela_test::MakeDirectories(kFile);
  EXPECT_EQ(Get("key"), (Reading{-1, ""}));
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
}

TEST_F(KeyValueRead, IsMinusOneWithoutReadPermission) {
  WriteFile(kFile, "key=\"value\"\n");
  ASSERT_EQ(chmod(kFile, 0200), 0);
  const vela_test::WithoutCapabilities ordinary;
  EXPECT_EQ(Get("key").result, -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
}

TEST_F(KeyValueRead, RefusesNullArguments) {
  char out[8] = "x";
  EXPECT_EQ(VLIBCFileGetKeyValue(nullptr, "key", out, sizeof(out), 0), -1);
  EXPECT_EQ(VLIBCFileGetKeyValue(kFile, nullptr, out, sizeof(out), 0), -1);
}

TEST_F(KeyValueRead, DropsWhiteSpaceAroundKeyAndEqualsSign) {
  WriteFile(kFile, " \t a \t = \t \"1\"\n\tb=  2  \t\nc  =3\r\n");
  EXPECT_EQ(Get("a"), (Reading{1, "1"}));
  EXPECT_EQ(Get("b"), (Reading{1, "2"}));
  EXPECT_EQ(Get("c"), (Reading{1, "3"}));
}

TEST_F(KeyValueRead, KeepsWhiteSpaceInQuotes) {
  WriteFile(kFile, "a=\"  1\t \"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "  1\t "}));
}

TEST_F(KeyValueRead, SkipsBlankLinesAndComments) {
  WriteFile(kFile, "\n   \n#a=\"1\"\n \t # a=\"2\"\na=\"3\"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "3"}));
  EXPECT_EQ(Get("#a"), (Reading{0, ""}));
}

TEST_F(KeyValueRead, SkipsLinesWithoutEqualsSign) {
  WriteFile(kFile, "a\na \"1\"\na=\"2\"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "2"}));
}

TEST_F(KeyValueRead, FirstLineWithTheKeyWins) {
  WriteFile(kFile, "a=\"first\"\na=\"second\"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "first"}));
}

TEST_F(KeyValueRead, KnowsTwoEscapesInQuotesOnly) {
  WriteFile(kFile, R"(a="say \"x\" \\ \n"
b=say \"x\" \\
c="\\"
d="\\\""
)");
  EXPECT_EQ(Get("a"), (Reading{1, R"(say "x" \ \n)"}));
  EXPECT_EQ(Get("b"), (Reading{1, R"(say \"x\" \\)"}));
  EXPECT_EQ(Get("c"), (Reading{1, "\\"}));
  EXPECT_EQ(Get("d"), (Reading{1, "\\\""}));
}

TEST_F(KeyValueRead, KeepsABackslashThatEscapesNothing) {
  WriteFile(kFile, "a=\"C:\\dir\\new\"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "C:\\dir\\new"}));
}

TEST_F(KeyValueRead, TakesAnUnclosedQuoteForABareValue) {
  WriteFile(kFile, "a=\"open  \nb=\"\n");
  EXPECT_EQ(Get("a"), (Reading{1, "\"open"}));
  EXPECT_EQ(Get("b"), (Reading{1, "\""}));
}

TEST_F(KeyValueRead, KeepsHashAndEqualsSignsInValues) {
  WriteFile(kFile, "a=\"1#2=3\"\nb=1#2=3\n");
  EXPECT_EQ(Get("a"), (Reading{1, "1#2=3"}));
  EXPECT_EQ(Get("b"), (Reading{1, "1#2=3"}));
}

TEST_F(KeyValueRead, ReadsALastLineWithoutNewline) {
  WriteFile(kFile, "a=\"1\"\nb=\"2\"");
  EXPECT_EQ(Get("b"), (Reading{1, "2"}));
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

class KeyValueCheck : public vela_test::SandboxTest {};

TEST_F(KeyValueCheck, IsOneForExactlyThisValue) {
  WriteFile(kFile, "a=\"yes\"\nempty=\"\"\n");
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "a", "yes", 0), 1);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "empty", "", 0), 1);
}

TEST_F(KeyValueCheck, IsZeroForAnythingElse) {
  WriteFile(kFile, "a=\"yes\"\n");
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "a", "Yes", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "a", "yes ", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "a", "ye", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "a", "", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "b", "yes", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue("/var/spool/absent", "a", "yes", 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, nullptr, "yes", 0), 0);
}

TEST_F(KeyValueCheck, ComparesValuesOfAnyLengthAndByte) {
  const std::string longValue(10000, 'x');
  WriteFile(kFile, "long=\"" + longValue + "y\"\nnul=\"yes" + std::string(1, '\0') + "no\"\n");
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "long", (longValue + "y").c_str(), 0), 1);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "long", (longValue + "z").c_str(), 0), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(kFile, "nul", "yes", 0), 0);
}

class KeyValueSet : public vela_test::SandboxTest {
 protected:
  static int Set(const char* key, const char* value) {
    return VLIBCFileSetKeyValue(kFile, key, value, 0);
  }
};

TEST_F(KeyValueSet, MakesTheFileWithMode0644) {
  const mode_t mask = umask(077);
  EXPECT_EQ(Set("a", "1"), 0);
  umask(mask);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
  EXPECT_EQ(ModeOf(kFile), 0644);
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, ReplacesTheFirstLineWithTheKeyOnly) {
  WriteFile(kFile, "# head\nb=\"0\"\n a = 1 \na=\"2\"\nc=\"3\"\n");
  EXPECT_EQ(Set("a", "9"), 0);
  EXPECT_EQ(ReadFile(kFile), "# head\nb=\"0\"\na=\"9\"\na=\"2\"\nc=\"3\"\n");
}

TEST_F(KeyValueSet, AppendsAnAbsentKey) {
  WriteFile(kFile, "#a=\"0\"\nb=\"1\"\n");
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile(kFile), "#a=\"0\"\nb=\"1\"\na=\"2\"\n");
}

TEST_F(KeyValueSet, KeepsEveryOtherLineByteForByte) {
  constexpr char kOdd[] = "\r\n\xff\xfe=\x01\r\nno pair at all\n\0nul\0=\0\n";
  const std::string odd = std::string(kOdd, sizeof(kOdd) - 1) + std::string(70000, 'l') + "\n\n";
  WriteFile(kFile, odd + "a=\"1\"\n" + odd);
  EXPECT_EQ(Set("a", "22"), 0);
  EXPECT_EQ(ReadFile(kFile), odd + "a=\"22\"\n" + odd);
}

TEST_F(KeyValueSet, EndsALastLineWithoutNewlineBeforeAppending) {
  WriteFile(kFile, "b=\"1\"");
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile(kFile), "b=\"1\"\na=\"2\"\n");
}

TEST_F(KeyValueSet, KeepsALastLineWithoutNewlineWhenAnotherLineChanges) {
  WriteFile(kFile, "a=\"1\"\nb=\"2\"");
  EXPECT_EQ(Set("a", "3"), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"3\"\nb=\"2\"");
}

TEST_F(KeyValueSet, WritesWhatIsReadBack) {
  std::string everyByte;
  for (int byte = 1; byte < 256; ++byte) {
    if (byte != '\n') everyByte += static_cast<char>(byte);
  }
  const std::string values[] = {
      "",  " ",     "\"", "\\",    "\\\"", "a\\",     "\\n",   "#",
      "=", "  x  ", "\r", "\"x\"", "x\"",  everyByte, "tab\t", std::string(5000, '"')};
  for (const std::string& value : values) {
    EXPECT_EQ(Set("first", "kept"), 0);
    EXPECT_EQ(Set("a", value.c_str()), 0);
    EXPECT_EQ(Get("a", 20000), (Reading{1, value}));
    EXPECT_EQ(Get("first"), (Reading{1, "kept"}));
  }
}

TEST_F(KeyValueSet, RefusesWhatALineCannotHold) {
  WriteFile(kFile, "a=\"1\"\n");
  EXPECT_EQ(Set("", "v"), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(Set("a=b", "v"), -1);
  EXPECT_EQ(Set("a\nb", "v"), -1);
  EXPECT_EQ(Set("a", "v\nw"), -1);
  EXPECT_EQ(Set("a", "v\n"), -1);
  EXPECT_EQ(Set("#a", "v"), -1);
  EXPECT_EQ(Set(" a", "v"), -1);
  EXPECT_EQ(Set("a\t", "v"), -1);
  EXPECT_EQ(Set(" ", "v"), -1);
  EXPECT_EQ(Set(nullptr, "v"), -1);
  EXPECT_EQ(Set("a", nullptr), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue(nullptr, "a", "v", 0), -1);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, KeepsModeAndOwner) {
  WriteFile(kFile, "a=\"1\"\n");
  ASSERT_EQ(chmod(kFile, 0640), 0);
  // Where the sandbox knows no second user, the owner stays the first one.
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
  const int reader = open(kFile, O_RDONLY | O_CLOEXEC);
  ASSERT_GE(reader, 0);
  EXPECT_EQ(Set("a", "new"), 0);
  char text[64] = "";
  EXPECT_EQ(read(reader, text, sizeof(text) - 1), 8);
  EXPECT_STREQ(text, "a=\"old\"\n");
  close(reader);
}

TEST_F(KeyValueSet, FailsWithoutTraceInAReadOnlyDirectory) {
  WriteFile("/var/spool/closed/values", "a=\"1\"\n");
  const vela_test::ReadOnlyMount closed("/var/spool/closed");
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/closed/values", "a", "2", 0), -1);
  EXPECT_EQ(VLIBCErrGet(), EROFS);
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/closed/other", "a", "2", 0), -1);
  EXPECT_EQ(ReadFile("/var/spool/closed/values"), "a=\"1\"\n");
}

TEST_F(KeyValueSet, FailsForAFileThatMayNotBeWritten) {
  WriteFile(kFile, "a=\"1\"\n");
  ASSERT_EQ(chmod(kFile, 0444), 0);
  const vela_test::WithoutCapabilities ordinary;
  EXPECT_EQ(Set("a", "2"), -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
}

TEST_F(KeyValueSet, FailsForAnythingButARegularFile) {
  vela_test::MakeDirectories("/var/spool/directory");
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/directory", "a", "1", 0), -1);
  ASSERT_EQ(mkfifo("/var/spool/fifo", 0600), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/fifo", "a", "1", 0), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/absent/file", "a", "1", 0), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
}

TEST_F(KeyValueSet, KeepsTheOldFileOnAFullVolume) {
  vela_test::SmallVolume volume("/var/spool/full", 1 << 20);
  const std::string path = "/var/spool/full/values";
  const std::string big(100000, 'x');
  WriteFile(path, "a=\"" + big + "\"\n");
  volume.SetAvailable(0);
  EXPECT_EQ(VLIBCFileSetKeyValue(path.c_str(), "b", "1", 0), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOSPC);
  EXPECT_EQ(ReadFile(path), "a=\"" + big + "\"\n");
  EXPECT_EQ(ListDirectory("/var/spool/full"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, RemovesItsScratchFileWhenAWriteFails) {
  WriteFile(kFile, "a=\"1\"\nb=\"" + std::string(5000, 'x') + "\"\n");
  const std::string before = ReadFile(kFile);
  const int result = platform_test::RunForked([] {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{100, 100};
    setrlimit(RLIMIT_FSIZE, &limit);
    return VLIBCFileSetKeyValue(kFile, "a", "2", 0) == -1 && VLIBCErrGet() == EFBIG ? 0 : 1;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(ReadFile(kFile), before);
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, GoesThroughALinkToTheFileBehindIt) {
  vela_test::MakeDirectories("/var/spool/real");
  WriteFile("/var/spool/real/target", "a=\"1\"\n");
  ASSERT_EQ(symlink("real/target", kFile), 0);
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile("/var/spool/real/target"), "a=\"2\"\n");
  struct stat link;
  ASSERT_EQ(lstat(kFile, &link), 0);
  EXPECT_TRUE(S_ISLNK(link.st_mode));
  EXPECT_EQ(ListDirectory("/var/spool/real"), std::vector<std::string>{"target"});
}

TEST_F(KeyValueSet, FailsForALinkThatLeadsNowhere) {
  ASSERT_EQ(symlink("/var/spool/absent/target", kFile), 0);
  EXPECT_EQ(Set("a", "2"), -1);
  ASSERT_EQ(unlink(kFile), 0);
  ASSERT_EQ(symlink("nowhere", kFile), 0);
  EXPECT_EQ(Set("a", "2"), -1);
}

TEST_F(KeyValueSet, WaitsForTheLockOfAnotherProcess) {
  WriteFile(kFile, "a=\"1\"\n");
  const int holder = open(kFile, O_RDWR | O_CLOEXEC);
  ASSERT_GE(holder, 0);
  ASSERT_EQ(flock(holder, LOCK_EX), 0);
  const pid_t setter = platform_test::Fork([holder] {
    close(holder);  // else the copy would keep the lock
    return Set("a", "2") == 0 ? 0 : 1;
  });
  usleep(100000);
  EXPECT_EQ(ReadFile(kFile), "a=\"1\"\n");
  close(holder);
  EXPECT_EQ(platform_test::Join(setter), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, SetsInTheFileThatHasTakenThePlaceOfTheLockedOne) {
  WriteFile(kFile, "a=\"1\"\n");
  const int holder = open(kFile, O_RDWR | O_CLOEXEC);
  ASSERT_GE(holder, 0);
  ASSERT_EQ(flock(holder, LOCK_EX), 0);
  const pid_t setter = platform_test::Fork([holder] {
    close(holder);  // else the copy would keep the lock
    return Set("a", "2") == 0 ? 0 : 1;
  });
  usleep(100000);
  WriteFile("/var/spool/new", "a=\"5\"\nb=\"6\"\n");
  ASSERT_EQ(rename("/var/spool/new", kFile), 0);
  close(holder);
  EXPECT_EQ(platform_test::Join(setter), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\nb=\"6\"\n");
}

TEST_F(KeyValueSet, MakesTheFileAnewWhenTheLockedOneIsRemoved) {
  WriteFile(kFile, "b=\"1\"\n");
  const int holder = open(kFile, O_RDWR | O_CLOEXEC);
  ASSERT_GE(holder, 0);
  ASSERT_EQ(flock(holder, LOCK_EX), 0);
  const pid_t setter = platform_test::Fork([holder] {
    close(holder);  // else the copy would keep the lock
    return Set("a", "2") == 0 ? 0 : 1;
  });
  usleep(100000);
  ASSERT_EQ(unlink(kFile), 0);
  close(holder);
  EXPECT_EQ(platform_test::Join(setter), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, RemovesWhatADeadWriterHasLeft) {
  WriteFile(kFile, "a=\"1\"\n");
  WriteFile(std::string(kFile) + ".replacement", "half of a line");
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});

  WriteFile("/var/spool/other.replacement", "half");
  EXPECT_EQ(VLIBCFileSetKeyValue("/var/spool/other", "a", "1", 0), 0);
  EXPECT_EQ(ReadFile("/var/spool/other"), "a=\"1\"\n");
}

TEST_F(KeyValueSet, DoesNotTakeTheScratchFileOfALivingWriter) {
  const std::string scratch = std::string(kFile) + ".replacement";
  WriteFile(kFile, "a=\"1\"\n");
  const int living = open(scratch.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  ASSERT_GE(living, 0);
  ASSERT_EQ(flock(living, LOCK_EX), 0);
  const pid_t setter = platform_test::Fork([living] {
    close(living);  // else the copy would keep the lock
    return Set("a", "2") == 0 ? 0 : 1;
  });
  usleep(100000);
  ASSERT_EQ(rename(scratch.c_str(), "/var/spool/moved"), 0);
  close(living);
  EXPECT_EQ(platform_test::Join(setter), 0);
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
  EXPECT_EQ(ReadFile("/var/spool/moved"), "");
}

TEST_F(KeyValueSet, NeverWritesThroughSomethingAtTheScratchName) {
  const std::string scratch = std::string(kFile) + ".replacement";
  WriteFile(kFile, "a=\"1\"\n");
  WriteFile("/var/spool/precious", "untouched");
  ASSERT_EQ(symlink("precious", scratch.c_str()), 0);
  EXPECT_EQ(Set("a", "2"), -1);
  EXPECT_EQ(ReadFile("/var/spool/precious"), "untouched");
  ASSERT_EQ(unlink(scratch.c_str()), 0);
  ASSERT_EQ(link("/var/spool/precious", scratch.c_str()), 0);
  EXPECT_EQ(Set("a", "2"), 0);
  EXPECT_EQ(ReadFile("/var/spool/precious"), "untouched");
  EXPECT_EQ(ReadFile(kFile), "a=\"2\"\n");
}

TEST_F(KeyValueSet, LosesNoKeyOfSeveralWriters) {
  constexpr int kWriters = 6;
  constexpr int kRounds = 60;
  std::vector<pid_t> writers;
  for (int writer = 0; writer < kWriters; ++writer) {
    writers.push_back(platform_test::Fork([writer] {
      for (int round = 0; round < kRounds; ++round) {
        const std::string key = "k" + std::to_string(writer) + "_" + std::to_string(round);
        if (Set(key.c_str(), std::to_string(round).c_str()) != 0) return 1;
        // The own counter, which no other writer sets, must never be seen going back.
        const std::string own = "counter" + std::to_string(writer);
        char value[16] = "0";
        VLIBCFileGetKeyValue(kFile, own.c_str(), value, sizeof(value), 0);
        if (atoi(value) != round) return 2;
        if (Set(own.c_str(), std::to_string(round + 1).c_str()) != 0) return 3;
      }
      return 0;
    }));
  }
  for (const pid_t writer : writers) EXPECT_EQ(platform_test::Join(writer), 0);
  EXPECT_EQ(vela_test::ReadLines(kFile).size(), size_t{kWriters * (kRounds + 1)});
  for (int writer = 0; writer < kWriters; ++writer) {
    EXPECT_EQ(Get(("counter" + std::to_string(writer)).c_str()),
              (Reading{1, std::to_string(kRounds)}));
  }
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, LetsReadersSeeWholeFilesOnly) {
  const std::string filler(20000, 'f');
  WriteFile(kFile, "filler=\"" + filler + "\"\na=\"0\"\nend=\"here\"\n");
  const pid_t writer = platform_test::Fork([] {
    for (int i = 0; i < 300; ++i) {
      if (Set("a", std::to_string(i).c_str()) != 0) return 1;
    }
    return 0;
  });
  for (int i = 0; i < 300; ++i) {
    ASSERT_EQ(VLIBCFileCheckKeyValue(kFile, "end", "here", 0), 1);
  }
  EXPECT_EQ(platform_test::Join(writer), 0);
}

TEST_F(KeyValueSet, SurvivesWritersThatAreKilled) {
  WriteFile(kFile, "kept=\"yes\"\n");
  for (int round = 0; round < 30; ++round) {
    const pid_t writer = platform_test::Fork([] {
      for (int i = 0;; ++i) Set("a", std::to_string(i).c_str());
      return 0;
    });
    usleep(static_cast<useconds_t>(500 + round * 137));
    kill(writer, SIGKILL);
    EXPECT_EQ(platform_test::Join(writer), -SIGKILL);
    ASSERT_EQ(VLIBCFileCheckKeyValue(kFile, "kept", "yes", 0), 1);
  }
  EXPECT_EQ(Set("b", "1"), 0);
  EXPECT_EQ(ListDirectory("/var/spool"), std::vector<std::string>{"values"});
}

TEST_F(KeyValueSet, OneFileMadeByManyAtOnceHasTheKeysOfAll) {
  for (int round = 0; round < 20; ++round) {
    vela_test::RemoveTree(kFile);
    std::vector<pid_t> writers;
    for (int writer = 0; writer < 5; ++writer) {
      writers.push_back(platform_test::Fork(
          [writer] { return Set(std::to_string(writer).c_str(), "x") == 0 ? 0 : 1; }));
    }
    for (const pid_t writer : writers) ASSERT_EQ(platform_test::Join(writer), 0);
    ASSERT_EQ(vela_test::ReadLines(kFile).size(), 5U);
  }
}

TEST_F(KeyValueSet, LeavesNoDescriptorOpen) {
  ASSERT_EQ(Set("a", "1"), 0);
  const int before = platform_test::CountDescriptors();
  for (int i = 0; i < 20; ++i) {
    Set("a", "2");
    Get("a");
    VLIBCFileSetKeyValue("/var/spool", "a", "1", 0);
    VLIBCFileCheckKeyValue(kFile, "a", "2", 0);
  }
  EXPECT_EQ(platform_test::CountDescriptors(), before);
}

}  // namespace
