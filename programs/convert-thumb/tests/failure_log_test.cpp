// The line that a failed run leaves in the system log.

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "converter_fixture.h"
#include "posix/log.h"
#include "process/confinement.h"
#include "process/failure_report.h"
#include "process/unfinished_outputs.h"
#include "support/namespaces.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;
using Lines = std::vector<std::string>;

class FailureLog : public ConverterTest {
 protected:
  std::string Output() const { return directory_ + "/o.jpg"; }

  /// Runs the converter on this file, which it cannot convert.
  ProgramResult Fail(const std::string& source,
                     const ProgramOptions& options = ProgramOptions()) const {
    const CommandLine line{source, "", {{{}, Output()}}};
    ProgramResult result = RunConverter(line.Arguments(), options);
    EXPECT_EQ(result.exitCode, 1) << source;
    return result;
  }

  std::string MakeText(const std::string& name) const {
    const std::string path = directory_ + "/" + name;
    MakeDirectories(path.substr(0, path.rfind('/')));
    WriteFile(path, "no photo");
    return path;
  }
};

TEST_F(FailureLog, NamesThePhotoAndTheReasonAtErrorPriority) {
  Fail(MakeText("a.jpg"));
  const std::vector<LogMessage> messages = LogMessages();
  ASSERT_THAT(messages, SizeIs(1));
  EXPECT_EQ(messages[0].priority, 3);
  EXPECT_EQ(messages[0].text, "convert-thumb: /tmp/converter/a.jpg: not a photo in a known format");
}

TEST_F(FailureLog, HasTheSameReasonAsStandardError) {
  const ProgramResult result = Fail("/tmp/converter/none.jpg");
  EXPECT_EQ(result.err,
            "convert-thumb: cannot open /tmp/converter/none.jpg: No such file or directory\n");
  EXPECT_EQ(ErrorLines(), Lines{"convert-thumb: /tmp/converter/none.jpg: cannot open "
                                "/tmp/converter/none.jpg: No such file or directory"});
}

TEST_F(FailureLog, NamesThePhotoWhoseDecodedCopyOrThumbnailCannotBeConverted) {
  Fail(MakeText("@eaDir/b.nef/RAW_TEMP.ppm"));
  Fail(MakeText("@eaDir/c.jpg/VELAPHOTO_THUMB_XL.jpg"));
  Fail(MakeText("eaDir/c.jpg/a.jpg"));
  EXPECT_EQ(ErrorLines(),
            (Lines{"convert-thumb: /tmp/converter/b.nef (RAW_TEMP.ppm): not a photo in a known "
                   "format",
                   "convert-thumb: /tmp/converter/c.jpg (VELAPHOTO_THUMB_XL.jpg): not a photo in a "
                   "known format",
                   "convert-thumb: /tmp/converter/eaDir/c.jpg/a.jpg: not a photo in a known "
                   "format"}));
}

TEST_F(FailureLog, HasTheWholePathOfARelativeName) {
  MakeText("a.jpg");
  ProgramOptions options;
  options.workingDirectory = directory_;
  Fail("a.jpg", options);
  EXPECT_EQ(ErrorLines(),
            Lines{"convert-thumb: /tmp/converter/a.jpg: not a photo in a known format"});
}

TEST_F(FailureLog, IsOneLineWhateverThePhotosName) {
  Fail(MakeText("a\n<11>sshd: accepted\x1b[2J\xe2\x80\xa8\xe9.jpg"));
  EXPECT_EQ(
      ErrorLines(),
      Lines{"convert-thumb: /tmp/converter/a\\n<11>sshd: accepted\\x1b[2J\\xe2\\x80\\xa8\\xe9.jpg:"
            " not a photo in a known format"});
}

TEST_F(FailureLog, HasTheReasonThatImageMagickGives) {
  const std::string photo = MakeImage(directory_ + "/a.bmp", 300, 200);
  WriteFile(photo, ReadFile(photo).substr(0, 1000));
  const ProgramResult result = Fail(photo);
  EXPECT_THAT(result.err, HasSubstr("improper image header"));
  EXPECT_EQ(ErrorLines(),
            Lines{"convert-thumb: /tmp/converter/a.bmp: ImageMagick: improper image header"});
}

TEST_F(FailureLog, NamesAnInvalidOptionOfTheProfileWhereOthersCanChangeTheFolder) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  ThumbOptions options;
  options.unsharp = "foo";
  const std::string folder = directory_ + "/@eaDir/a.jpg";
  const CommandLine line{photo, "", {{options, folder + "/VELAPHOTO_THUMB_S.jpg"}}};
  MakeDirectories(folder);
  for (const std::string& own : {directory_ + "/@eaDir", folder}) {
    ASSERT_EQ(chmod(own.c_str(), 0755), 0);
  }
  // Where nobody else can interfere, ImageMagick says it.
  EXPECT_THAT(RunConverter(line.Arguments()).err, HasSubstr("-unsharp': foo"));
  ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
  const std::string reason =
      "the option -unsharp foo is only known to ImageMagick, which is not "
      "given " +
      folder + "/VELAPHOTO_THUMB_S.jpg: others can change its directory";
  EXPECT_EQ(RunConverter(line.Arguments()).err, "convert-thumb: " + reason + "\n");
  EXPECT_EQ(ErrorLines().back(), "convert-thumb: " + photo + ": " + reason);
}

TEST_F(FailureLog, NamesTheOutputWhenTheOptionsAreSupported) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const std::string folder = directory_ + "/@eaDir/a.jpg";
  MakeDirectories(folder);
  ASSERT_EQ(chmod(folder.c_str(), 0777), 0);
  const std::string output = folder + "/a.jpg";
  EXPECT_EQ(RunConverter({photo, output}).err,
            "convert-thumb: " + output +
                ": ImageMagick is not given this name in a directory that others can change\n");
}

TEST_F(FailureLog, SaysThatImageMagickIsMissing) {
  const std::string photo = MakeImage(directory_ + "/a.bmp", 300, 200);
  const WithoutImageMagick without;
  EXPECT_EQ(Fail(photo).err,
            std::string("convert-thumb: ") + kImageMagick + ": No such file or directory\n");
  EXPECT_EQ(ErrorLines(), Lines{std::string("convert-thumb: /tmp/converter/a.bmp: ImageMagick: ") +
                                kImageMagick + ": No such file or directory"});
}

TEST_F(FailureLog, IsEmptyAfterASuccess) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const CommandLine line{photo, "", {{{}, Output()}}};
  ExpectSuccess(RunConverter(line.Arguments()));
  EXPECT_THAT(LogMessages(), IsEmpty());
}

TEST_F(FailureLog, IsEmptyWhenOnlyTheReasonIsWanted) {
  const std::string text = MakeText("a.jpg");
  const ProgramResult result =
      RunConverter({text, "-thumbnail", "320x320>", "-quality", "80", "jpg:/dev/null"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "convert-thumb: " + text + ": not a photo in a known format\n");
  EXPECT_THAT(LogMessages(), IsEmpty());
  EXPECT_EQ(ListDirectory(directory_), Lines{"a.jpg"});
}

TEST_F(FailureLog, ChangesNothingWhenThereIsNoLog) {
  RemoveTree("/dev/log");
  const ProgramResult result = Fail(MakeText("a.jpg"));
  StartLogRecorder();
  EXPECT_EQ(result.err, "convert-thumb: /tmp/converter/a.jpg: not a photo in a known format\n");
}

/// Runs in a child, which it ends.
void EndBySignal(int signal) {
  vela::LogFailuresOf("/tmp/converter/a.jpg");
  vela::CleanUpOnFatalSignals();
  raise(signal);
  _exit(0);
}

TEST_F(FailureLog, HasALineWhenALibraryAborts) {
  EXPECT_EXIT(EndBySignal(SIGABRT), ExitedWithCode(1),
              "^convert-thumb: a library aborted, probably because it ran out of memory\n$");
  EXPECT_EQ(ErrorLines(), Lines{"convert-thumb: /tmp/converter/a.jpg: a library aborted, probably "
                                "because it ran out of memory"});
}

TEST_F(FailureLog, HasALineWhenTheRunIsEndedBySignal) {
  const struct {
    int signal;
    std::string reason;
  } cases[] = {
    {SIGBUS, "the photo changed while it was being read"},
    {SIGXCPU, "the photo takes too much processor time"},
#if !defined(__SANITIZE_ADDRESS__)  // AddressSanitizer reports crashes itself
    {SIGSEGV, "a library crashed on this photo"},
    {SIGFPE, "a library crashed on this photo"},
    {SIGILL, "a library crashed on this photo"},
#endif
  };
  Lines expected;
  for (const auto& [signal, reason] : cases) {
    EXPECT_EXIT(EndBySignal(signal), ExitedWithCode(1), "^convert-thumb: " + reason + "\n$")
        << signal;
    expected.push_back("convert-thumb: /tmp/converter/a.jpg: " + reason);
  }
  EXPECT_EQ(ErrorLines(), expected);
}

#if !defined(__SANITIZE_ADDRESS__)
/// Uses up the stack of a process.
int Recurse(int depth) {
  volatile char page[4096];
  page[0] = static_cast<char>(depth);
  return depth < 0 ? 0 : Recurse(depth + 1) + page[0];
}

TEST_F(FailureLog, HasALineWhenTheStackIsFull) {
  EXPECT_EXIT(
      {
        vela::LogFailuresOf("/tmp/converter/a.jpg");
        vela::CleanUpOnFatalSignals();
        _exit(Recurse(0));
      },
      ExitedWithCode(1), "^convert-thumb: a library crashed on this photo\n$");
  EXPECT_EQ(ErrorLines(),
            Lines{"convert-thumb: /tmp/converter/a.jpg: a library crashed on this photo"});
}
#endif

/// The errors of sending through a connected socket, to it and to another one, after the process
/// has confined itself: "0" for success.
std::string ErrorsOfSending() {
  const int log = socket(AF_UNIX, SOCK_DGRAM, 0);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::snprintf(address.sun_path, sizeof address.sun_path, "/dev/log");
  const auto* const to = reinterpret_cast<const sockaddr*>(&address);
  if (connect(log, to, sizeof address) != 0 || vela::Confine(vela::AllowedFiles()) != 0) {
    return "not confined";
  }
  const auto error = [](ssize_t result) { return std::to_string(result < 0 ? errno : 0) + " "; };
  msghdr message = {};
  message.msg_name = &address;
  message.msg_namelen = sizeof address;
  mmsghdr several = {message, 0};
  std::string errors = error(send(log, "a", 1, 0));
  errors += error(sendto(log, "b", 1, 0, to, sizeof address));
  errors += error(sendmsg(log, &message, 0));
  errors += error(sendmmsg(log, &several, 1, 0));
  errors += error(socket(AF_UNIX, SOCK_DGRAM, 0));
  return errors + error(connect(log, to, sizeof address));
}

TEST_F(FailureLog, IsAllThatAConfinedConverterCanSendTo) {
  EXPECT_EXIT(
      {
        std::fputs(ErrorsOfSending().c_str(), stderr);
        _exit(0);
      },
      ExitedWithCode(0), "^0 1 1 1 1 1 $");
  EXPECT_EQ(ErrorLines(), Lines{"<-1> a"});
}

}  // namespace
}  // namespace vela_test
