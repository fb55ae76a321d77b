// What the tools can do, whatever they are made to do by a photo: other programs take their places.
#include "platform/standalone/tool_confinement.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <thread>

#include "platform/tool_fixture.h"
#include "posix/landlock.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr char kPhoto[] = "/tmp/photos/a.jpg";
constexpr char kOther[] = "/tmp/photos/b.jpg";
constexpr char kSecret[] = "/tmp/private/secret.jpg";
constexpr char kList[] = "/usr/vela/etc/unconfined-tools";

bool HasLandlock() {
  return vela::LandlockVersion() >= 1;
}

/// Runs a tool and returns its output; "not started" when it cannot be started.
template <typename... Arguments>
std::string OutputOf(const char* tool, Arguments... arguments) {
  FILE* const stream = VLIBCPopen(tool, "r", arguments..., nullptr);
  if (stream == nullptr) {
    return "not started";
  }
  std::string output;
  char chunk[4096];
  for (size_t got = 0; (got = fread(chunk, 1, sizeof chunk, stream)) > 0;) {
    output.append(chunk, got);
  }
  VLIBCPclose(stream);
  return output;
}

void InstallProgram(const std::string& path, const std::string& content) {
  RemoveTree(path);
  WriteFile(path, content);
  chmod(path.c_str(), 0755);
}

class ToolConfinement : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kPhoto, "photo ");
    WriteFile(kOther, "other ");
    WriteFile(kSecret, "secret ");
    MakeDirectories("/tmp/out");
    MakeDirectories("/tmp/turned");
  }

  /// A tool that prints the files in its arguments.
  static void InstallPrinter(const char* path) { InstallProgram(path, ReadFile("/usr/bin/cat")); }

  static std::string UnlessLandlock(const std::string& output) {
    return HasLandlock() ? "" : output;
  }
};

TEST_F(ToolConfinement, DcrawReadsOnlyItsPhoto) {
  InstallPrinter(kDcrawPath);
  EXPECT_EQ(OutputOf(kDcrawPath, kSecret, kOther, kPhoto),
            UnlessLandlock("secret other ") + "photo ");
}

TEST_F(ToolConfinement, ExiftoolReadsOnlyItsPhoto) {
  InstallPrinter(kExiftoolPath);
  EXPECT_EQ(OutputOf(kExiftoolPath, kSecret, kOther, kPhoto),
            UnlessLandlock("secret other ") + "photo ");
}

TEST_F(ToolConfinement, CompareReadsOnlyItsTwoImages) {
  InstallPrinter(kComparePath);
  EXPECT_EQ(OutputOf(kComparePath, kSecret, kPhoto, kOther, "null:"),
            UnlessLandlock("secret ") + "photo other ");
}

TEST_F(ToolConfinement, NoToolReadsThePasswordsOrRunsPrograms) {
  for (const char* tool : {kDcrawPath, kExiftoolPath, kComparePath}) {
    InstallPrinter(tool);
    for (const char* file : {"/etc/passwd", "/etc/shadow", "/usr/bin/id", "/proc/1/environ"}) {
      if (HasLandlock()) {
        EXPECT_EQ(OutputOf(tool, file, kPhoto, kPhoto, "null:").find_first_not_of("photo "),
                  std::string::npos)
            << tool << " " << file;
      }
    }
  }
}

/// A converter that tries to write to and to read files, and prints those that it could.
constexpr char kGreedyConverter[] = R"(#!/bin/sh
for file in /tmp/out/x /tmp/turned/x /tmp/photos/x /tmp/private/x /tmp/x; do
  { true >"$file"; } 2>/dev/null && echo "wrote $file"
done
for file in /tmp/photos/a.jpg /tmp/photos/b.jpg /tmp/private/secret.jpg; do
  text=
  { read -r text <"$file" || [ -n "$text" ]; } 2>/dev/null && echo "read $file"
done
echo "scratch $MAGICK_TEMPORARY_PATH"
)";

Strings Lines(const std::string& text) {
  Strings lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) {
    lines.push_back(line);
  }
  return lines;
}

TEST_F(ToolConfinement, ConverterReadsItsPhotoAndWritesOnlyInTheDirectoriesOfItsOutputs) {
  if (!HasLandlock()) {
    return;
  }
  InstallProgram(kConverterPath, kGreedyConverter);
  EXPECT_THAT(Lines(OutputOf(kConverterPath, "-define", "registry:temporary-path=/tmp/out", kPhoto,
                             "-thumbnail", "1x1", "-write", "/tmp/turned/a.jpg", "/tmp/out/b.jpg")),
              ElementsAre("wrote /tmp/out/x", "wrote /tmp/turned/x", std::string("read ") + kPhoto,
                          "scratch "));
  EXPECT_THAT(
      Lines(OutputOf(kConverterPath, std::string(kOther).append("[0]").c_str(), "-thumbnail", "1x1",
                     "/tmp/turned/b.jpg")),
      ElementsAre("wrote /tmp/turned/x", std::string("read ") + kOther, "scratch /tmp/turned"));
}

TEST_F(ToolConfinement, ConverterThatTurnsAPictureWritesOnlyInItsDirectory) {
  if (!HasLandlock()) {
    return;
  }
  InstallProgram(kConverterPath, kGreedyConverter);
  CopyFile(kPhoto, "/tmp/turned/raw.jpg");
  EXPECT_THAT(Lines(OutputOf(kConverterPath, "-rotate", "90", "/tmp/turned/raw.jpg",
                             "/tmp/turned/raw.jpg")),
              ElementsAre("wrote /tmp/turned/x", "scratch /tmp/turned"));
}

/// Returns those of the files that a converter with these arguments, started in /tmp/here, could
/// write to.
Strings FilesWritten(const Strings& files, const Strings& arguments) {
  std::string script = "#!/bin/sh\n";
  for (const std::string& file : files) {
    MakeDirectories(file.substr(0, file.rfind('/')));
    script += "{ true >'" + file + "'; } 2>/dev/null && echo '" + file + "'\n";
  }
  InstallProgram(kConverterPath, script);
  std::vector<const char*> list;
  for (const std::string& argument : arguments) {
    list.push_back(argument.c_str());
  }
  list.resize(5);
  return Lines(OutputOf(kConverterPath, list[0], list[1], list[2], list[3], list[4]));
}

class OutputsOfTheConverter : public ToolConfinement {
 protected:
  void SetUp() override {
    if (!HasLandlock()) {
      GTEST_SKIP() << "the kernel has no Landlock";
    }
    ToolConfinement::SetUp();
    MakeDirectories("/tmp/here");
    ASSERT_EQ(chdir("/tmp/here"), 0);
  }
  void TearDown() override {
    EXPECT_EQ(chdir("/"), 0);
    ToolConfinement::TearDown();
  }
};

TEST_F(OutputsOfTheConverter, OpenNoDirectoryWhenTheyAreDiscarded) {
  EXPECT_THAT(FilesWritten({"/dev/null", "/dev/x", "/tmp/here/jpg:/dev/x", "/tmp/here/x"},
                           {kPhoto, "jpg:/dev/null"}),
              ElementsAre("/dev/null"));
  EXPECT_THAT(FilesWritten({"/tmp/here/jpg:/dev/x", "/tmp/out/x"},
                           {kPhoto, "-write", "jpg:/dev/null", "/tmp/out/b.jpg"}),
              ElementsAre("/tmp/out/x"));
}

TEST_F(OutputsOfTheConverter, OpenOnlyTheirRelativeDirectoryWhenItBeginsLikeAFormat) {
  EXPECT_THAT(FilesWritten({"/tmp/out/x", "/tmp/here/jpg:/tmp/out/x", "/tmp/here/x"},
                           {kPhoto, "jpg:/tmp/out/b.jpg"}),
              ElementsAre("/tmp/here/jpg:/tmp/out/x"));
  EXPECT_THAT(
      FilesWritten({"/tmp/here/a:b/x", "/tmp/here/b/x", "/tmp/here/x"}, {kPhoto, "a:b/b.jpg"}),
      ElementsAre("/tmp/here/a:b/x"));
  EXPECT_THAT(FilesWritten({"/dev/x", "/tmp/here/jpg:/dev/x"}, {kPhoto, "jpg:/dev/null.jpg"}),
              ElementsAre("/tmp/here/jpg:/dev/x"));
}

TEST_F(OutputsOfTheConverter, OpenNoOtherDirectoryOfTheSameNameWithFewerPercentSigns) {
  const Strings files = {"/tmp/turned/50%/x", "/tmp/turned/50%%/x"};
  MakeDirectories("/tmp/turned/50%%");
  CopyFile(kPhoto, "/tmp/turned/50%%/raw.jpg");
  EXPECT_THAT(FilesWritten(
                  files, {"-rotate", "90", "/tmp/turned/50%%/raw.jpg", "/tmp/turned/50%%/raw.jpg"}),
              ElementsAre("/tmp/turned/50%%/x"));
  EXPECT_THAT(FilesWritten(files, {kPhoto, "/tmp/turned/50%%/b.jpg"}),
              ElementsAre("/tmp/turned/50%/x"));
}

/// Makes Perl send a line to the system log.
constexpr char kLogging[] =
    "use Socket; socket(S, PF_UNIX, SOCK_DGRAM, 0) && connect(S, pack_sockaddr_un('/dev/log')) && "
    "syswrite(S, '<11>hello')";

void InstallPerl(const std::string& path) {
  InstallProgram(path, ReadFile("/usr/bin/perl"));
}

TEST_F(ToolConfinement, ConverterReachesTheSystemLog) {
  InstallPerl(kConverterPath);
  OutputOf(kConverterPath, "-e", kLogging);
  EXPECT_THAT(ErrorLines(), ElementsAre("hello"));
}

TEST_F(ToolConfinement, ConverterThatIsALinkToAnotherProgramDoesNotReachTheSystemLog) {
  InstallPerl("/usr/vela/bin/other");
  RemoveTree(kConverterPath);
  ASSERT_EQ(symlink("/usr/vela/bin/other", kConverterPath), 0);
  const std::string program = std::string(kLogging) + "; print 'ended'";
  EXPECT_EQ(OutputOf(kConverterPath, "-e", program.c_str()), "ended");
  EXPECT_THAT(ErrorLines(), ElementsAre());
}

TEST_F(ToolConfinement, NothingThatAConverterScriptRunsReachesTheSystemLog) {
  InstallPerl("/usr/bin/od");
  InstallProgram(kConverterPath, "#!/bin/sh\nod -e \"$1; print 'ended'\"\n");
  EXPECT_EQ(OutputOf(kConverterPath, kLogging), "ended");
  EXPECT_THAT(ErrorLines(), ElementsAre());
}

TEST_F(ToolConfinement, NoOtherToolReachesTheSystemLog) {
  for (const char* tool : {kDcrawPath, kExiftoolPath, kComparePath}) {
    InstallPerl(tool);
    OutputOf(tool, "-e", kLogging);
    EXPECT_THAT(ErrorLines(), ElementsAre()) << tool;
  }
}

TEST_F(ToolConfinement, ConverterFindsADirectoryWithPercentSigns) {
  InstallProgram(kConverterPath, "#!/bin/sh\necho >'/tmp/50%/%%/x' && echo wrote\n");
  MakeDirectories("/tmp/50%/%%");
  EXPECT_EQ(OutputOf(kConverterPath, kPhoto, "/tmp/50%%/%%%%/a.jpg"), "wrote\n");
}

TEST_F(ToolConfinement, ToolsInheritNoEnvironment) {
  setenv("SECRET_TOKEN", "secret", 1);
  setenv("LD_LIBRARY_PATH", "/tmp", 1);
  InstallProgram(kConverterPath, "#!/bin/sh\nexport -p\n");
  const std::string variables = OutputOf(kConverterPath, kPhoto, "/tmp/out/a.jpg");
  unsetenv("SECRET_TOKEN");
  unsetenv("LD_LIBRARY_PATH");
  EXPECT_THAT(
      Lines(variables),
      ElementsAre("export HOME='/'", "export LC_ALL='C'", "export MAGICK_TEMPORARY_PATH='/tmp/out'",
                  "export PATH='/usr/sbin:/usr/bin:/sbin:/bin'", "export PWD='/'"));
}

TEST_F(ToolConfinement, CompareIsLimitedToPhotosByThePolicy) {
  InstallProgram(kComparePath, ReadFile("/usr/bin/printenv"));
  EXPECT_EQ(OutputOf(kComparePath, "MAGICK_CONFIGURE_PATH", "XDG_CONFIG_HOME", "null:"),
            "/usr/vela/share/imagemagick\n/usr/vela/share/imagemagick/last\n");
}

TEST_F(ToolConfinement, ConverterThatIsAScriptCanExamineItsPhoto) {
  InstallProgram(kConverterPath, "#!/bin/sh\nod -An -v -tx1 -N2 -- \"$1\" | tr -d ' \\n'\n");
  EXPECT_EQ(OutputOf(kConverterPath, kPhoto, "/tmp/out/a.jpg"), "7068");
}

/// The limits as a shell prints them, in blocks and kilobytes.
constexpr char kPrintLimits[] =
    "#!/bin/sh\nulimit -t\nulimit -f\nulimit -d\nulimit -c\n"
    "while read -r line; do case $line in NoNewPrivs*|Seccomp:*) echo $line;; esac; done "
    "</proc/self/status\n";

TEST_F(ToolConfinement, EveryProgramHasLimits) {
  WriteFile("/etc/velainfo.conf", "tool_timeout=\"7\"\n");
  InstallProgram("/usr/vela/bin/any", kPrintLimits);
  const Strings lines = Lines(OutputOf("/usr/vela/bin/any"));
  ASSERT_EQ(lines.size(), 6U);
  const unsigned processors = std::max(1U, std::thread::hardware_concurrency());
  EXPECT_EQ(lines[0], std::to_string(8 * processors)) << "processor time";
  EXPECT_EQ(lines[1], "8388608") << "512-byte blocks of a file";
#ifndef __SANITIZE_ADDRESS__
  EXPECT_EQ(lines[2], "2097152") << "kilobytes of memory";
#endif
  EXPECT_EQ(lines[3], "0") << "blocks of a core dump";
  EXPECT_EQ(lines[4], "NoNewPrivs: 1");
  EXPECT_EQ(lines[5], "Seccomp: 2");
}

TEST_F(ToolConfinement, HasNoTimeLimitWithoutThatOfTheRun) {
  WriteFile("/etc/velainfo.conf", "tool_timeout=\"0\"\n");
  InstallProgram("/usr/vela/bin/any", kPrintLimits);
  EXPECT_EQ(Lines(OutputOf("/usr/vela/bin/any")).at(0), "unlimited");
}

class UnconfinedTools : public ToolConfinement {
 protected:
  void SetUp() override {
    ToolConfinement::SetUp();
    InstallPrinter(kDcrawPath);
  }

  static bool IsConfinedWith(const std::string& list, mode_t mode = 0644, uid_t owner = 0) {
    WriteFile(kList, list);
    EXPECT_EQ(chmod(kList, mode), 0);
    EXPECT_EQ(chown(kList, owner, 0), 0);
    return OutputOf(kDcrawPath, kSecret, kPhoto) == "photo ";
  }
};

TEST_F(UnconfinedTools, AreThoseWhosePathIsALine) {
  if (!HasLandlock()) {
    return;
  }
  EXPECT_FALSE(IsConfinedWith("/usr/bin/dcraw\n"));
  EXPECT_FALSE(IsConfinedWith("# our own\n\n/usr/bin/other\n/usr/bin/dcraw"));
  for (const char* list : {"", "\n", "dcraw\n", "# /usr/bin/dcraw\n", "/usr/bin/dcraw2\n",
                           "/usr/bin/\n", " /usr/bin/dcraw\n", "/usr/bin/other\n"}) {
    EXPECT_TRUE(IsConfinedWith(list)) << list;
  }
}

TEST_F(UnconfinedTools, AreNotNamedByAFileThatOthersCanChange) {
  if (!HasLandlock()) {
    return;
  }
  EXPECT_FALSE(IsConfinedWith("/usr/bin/dcraw\n", 0600));
  for (const mode_t mode : {0664, 0646, 0666}) {
    EXPECT_TRUE(IsConfinedWith("/usr/bin/dcraw\n", mode)) << mode;
  }
}

TEST_F(UnconfinedTools, AreNotNamedByAnotherUsersFile) {
  WriteFile(kList, "");
  if (!HasLandlock() || chown(kList, 1, 0) != 0) {
    return;
  }
  EXPECT_TRUE(IsConfinedWith("/usr/bin/dcraw\n", 0644, 1));
  EXPECT_FALSE(IsConfinedWith("/usr/bin/dcraw\n", 0644, 0));
}

TEST_F(UnconfinedTools, HaveLimitsAndNoEnvironmentAndGainNoPrivileges) {
  setenv("SECRET_TOKEN", "secret", 1);
  InstallProgram("/usr/vela/bin/any", std::string(kPrintLimits) + "export -p\n");
  WriteFile(kList, "/usr/vela/bin/any\n");
  const std::string output = OutputOf("/usr/vela/bin/any");
  unsetenv("SECRET_TOKEN");
  EXPECT_THAT(output, HasSubstr("8388608\n"));
  EXPECT_THAT(output, HasSubstr("NoNewPrivs: 1\nSeccomp: 0\n"));
  EXPECT_THAT(output, Not(HasSubstr("SECRET_TOKEN")));
}

}  // namespace
}  // namespace vela_test
