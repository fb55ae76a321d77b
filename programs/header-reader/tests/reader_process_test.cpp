// The header reader, and the program that asks it.

#include "header/reader_process.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <fstream>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "header/header_reader.h"
#include "posix/folder.h"
#include "posix/identity.h"
#include "posix/local_socket.h"
#include "support/files.h"
#include "support/images.h"
#include "support/other_user.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"
#include "support/system_log.h"
#include "support/users.h"

using namespace vela;

namespace {

/// A forked process, in which a leak check would report what its parent's other threads use.
bool g_isForked = false;

}  // namespace

#if defined(__SANITIZE_ADDRESS__)
extern "C" int __lsan_is_turned_off() {
  return g_isForked ? 1 : 0;
}
#endif

namespace vela_test {
namespace {

using std::chrono::seconds;

/// Forks. Returns 0 in the new process, which may call exit.
pid_t Fork() {
  const pid_t child = fork();
  g_isForked = child == 0;
  return child;
}

/// The processes of the sandbox with this command name.
std::set<pid_t> ProcessesCalled(const std::string& name) {
  std::set<pid_t> processes;
  for (const std::string& entry : ListDirectory("/proc")) {
    std::ifstream file("/proc/" + entry + "/comm");
    std::ifstream status("/proc/" + entry + "/stat");
    std::string comm;
    std::string line;
    if (std::getline(file, comm) && comm == name && std::getline(status, line) &&
        line.find(") Z ") == std::string::npos) {
      processes.insert(std::stoi(entry));
    }
  }
  return processes;
}

std::set<pid_t> Readers() {
  return ProcessesCalled("header-reader");
}

/// Waits up to 10 seconds for the condition.
bool WaitUntil(const std::function<bool()>& condition) {
  for (int tries = 0; tries < 10000; ++tries) {
    if (condition()) return true;
    usleep(1000);
  }
  return false;
}

OpenedFile Opened(const std::string& path) {
  OpenedFile file;
  EXPECT_EQ(OpenRegularFile(path, file), 0) << path;
  return file;
}

class HostileReader : public SandboxTest {
 protected:
  /// The process that answers the question; 0 when there is no answer.
  pid_t Ask(const std::string& command, uid_t owner = 0) {
    WriteFile("/tmp/command", command);
    OpenedFile file = Opened("/tmp/command");
    file.owner = owner;
    answer_ = process_.Ask(HeaderTopic::kImageSize, file);
    return answer_ ? static_cast<pid_t>(answer_->width) : 0;
  }

  std::optional<HeaderAnswer> answer_;
  ReaderProcess process_{BuiltPath(HOSTILE_READER_FILE), seconds(1)};
};

TEST_F(HostileReader, AnswersManyQuestions) {
  const pid_t first = Ask("answer");
  EXPECT_NE(first, 0);
  for (int i = 0; i < 100; ++i) EXPECT_EQ(Ask("answer"), first);
  process_.End();
  EXPECT_THAT(ProcessesCalled("hostile_reader"), testing::IsEmpty());
}

TEST_F(HostileReader, IsReplacedAfterEachFailure) {
  std::vector<std::string> commands = {"crash", "say nothing", "say too little", "end afterwards"};
#if !defined(__SANITIZE_ADDRESS__)
  commands.emplace_back("take memory");  // a sanitizer's shadow memory exceeds every limit
#endif
  for (const std::string& command : commands) {
    SCOPED_TRACE(command);
    const pid_t first = Ask("answer");
    const bool hasAnswer = Ask(command) != 0;
    EXPECT_EQ(hasAnswer, command == "end afterwards");
    const pid_t second = Ask("answer");
    EXPECT_NE(second, 0);
    EXPECT_NE(second, first);
  }
  process_.End();
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child was left";
}

TEST_F(HostileReader, CannotKeepItsParentWaiting) {
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Ask("say nothing"), 0);
  EXPECT_LT(std::chrono::steady_clock::now() - start, seconds(5));
}

TEST_F(HostileReader, CannotExceedTheSizeOfAnAnswer) {
  Ask("say too much");
  Ask("send an unterminated text");
  ASSERT_TRUE(answer_);
  EXPECT_EQ(std::string(answer_->orientation), std::string(kOrientationTextSize - 1, 'x'));
}

TEST_F(HostileReader, ReadsFilesOfOneUserOnly) {
  const pid_t first = Ask("answer", 1000);
  EXPECT_EQ(Ask("answer", geteuid()), first);
  EXPECT_EQ(Ask("answer", 1000), first);
  const pid_t second = Ask("answer", 1001);
  EXPECT_NE(second, first);
  EXPECT_NE(second, 0);
  EXPECT_NE(Ask("answer", 1000), second);
}

TEST_F(HostileReader, WorksForOneIdentityOnly) {
  if (!HasOtherUsers()) {
    return;  // there is one identity
  }
  const pid_t own = Ask("answer");
  {
    const AssumedIdentity identity({1000, 1000, {}});
    ASSERT_EQ(identity.Error(), 0);
    const auto answer = process_.Ask(HeaderTopic::kImageSize, Opened("/tmp/command"));
    // Without an answer, the program is not accessible to other users here.
    EXPECT_TRUE(!answer || static_cast<pid_t>(answer->width) != own);
    EXPECT_THAT(ProcessesCalled("hostile_reader"), testing::Not(testing::Contains(own)));
    ClearLog();
  }
  EXPECT_NE(Ask("answer"), 0);
  EXPECT_THAT(ProcessesCalled("hostile_reader"), testing::SizeIs(1));
}

TEST_F(HostileReader, ThatIsMissingIsLoggedOnce) {
  WriteFile("/tmp/command", "answer");
  ReaderProcess missing("/tmp/none");
  for (int i = 0; i < 3; ++i) {
    EXPECT_FALSE(missing.Ask(HeaderTopic::kImageSize, Opened("/tmp/command")));
  }
  EXPECT_THAT(ErrorLines(), testing::ElementsAre("libexec/velathumb/header-reader cannot be "
                                                 "started: No such file or directory"));
}

TEST(MessageSockets, AreNotWaitedForWithoutALimit) {
  const MessageSockets sockets = ConnectMessageSockets();
  ASSERT_EQ(LimitReceiving(sockets.other.Get(), seconds(1)), 0);
  char byte = 0;
  size_t got = 0;
  FileDescriptor file;
  EXPECT_EQ(ReceiveDescriptor(sockets.other.Get(), &byte, 1, got, file), EAGAIN);
  EXPECT_EQ(SendDescriptor(sockets.own.Get(), "x", sockets.own.Get()), 0);
  EXPECT_EQ(ReceiveDescriptor(sockets.other.Get(), &byte, 1, got, file), 0);
  EXPECT_TRUE(file.IsOpen());
  EXPECT_EQ(byte, 'x');
}

class HeaderReader : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    EndHeaderReader();
    MakeJpeg("/tmp/a.jpg");
  }
  void TearDown() override { EndHeaderReader(); }

  static std::string Size(const char* path = "/tmp/a.jpg") {
    uint32_t width = 0;
    uint32_t height = 0;
    const int error = ReadImageSize(path, width, height);
    return error != 0 ? "error " + std::to_string(error)
                      : std::to_string(width) + "x" + std::to_string(height);
  }
};

TEST_F(HeaderReader, IsStartedOnceAtTheFirstQuestion) {
  EXPECT_THAT(Readers(), testing::IsEmpty());
  EXPECT_EQ(Size(), "64x48");
  const std::set<pid_t> readers = Readers();
  EXPECT_EQ(readers.size(), 1U);
  for (int i = 0; i < 100; ++i) EXPECT_EQ(Size(), "64x48");
  EXPECT_EQ(Readers(), readers);
}

TEST_F(HeaderReader, IsReplacedWhenItHasBeenKilled) {
  for (int i = 0; i < 5; ++i) {
    EXPECT_EQ(Size(), "64x48");
    for (const pid_t reader : Readers()) kill(reader, SIGKILL);
    EXPECT_EQ(Size(), "64x48");
  }
}

TEST_F(HeaderReader, IsReplacedBeforeItsLimitsAreReached) {
  for (int i = 0; i < 2500; ++i) ASSERT_EQ(Size(), "64x48");
  EXPECT_EQ(Readers().size(), 1U);
}

TEST_F(HeaderReader, HasNoOtherDescriptors) {
  const int other = open("/tmp/a.jpg", O_RDONLY);  // inheritable
  EXPECT_EQ(Size(), "64x48");
  ASSERT_EQ(Readers().size(), 1U);
  const std::string process = "/proc/" + std::to_string(*Readers().begin());
  EXPECT_THAT(ListDirectory(process + "/fd"), testing::UnorderedElementsAre("0", "1", "2"));
  close(other);
}

TEST_F(HeaderReader, EndsWithItsParentThatIsKilled) {
  const pid_t child = fork();
  if (child == 0) {
    Size();
    pause();
  }
  EXPECT_TRUE(WaitUntil([] { return !Readers().empty(); }));
  kill(child, SIGKILL);
  waitpid(child, nullptr, 0);
  EXPECT_TRUE(WaitUntil([] { return Readers().empty(); }));
}

TEST_F(HeaderReader, EndsBeforeItsParentExits) {
  const pid_t child = Fork();
  if (child == 0) {
    exit(Size() == "64x48" ? 0 : 1);
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  EXPECT_THAT(Readers(), testing::IsEmpty());
}

TEST_F(HeaderReader, OfTheParentIsNotUsedAfterAFork) {
  EXPECT_EQ(Size(), "64x48");
  const std::set<pid_t> readers = Readers();
  const pid_t child = Fork();
  if (child == 0) {
    const bool isRead = Size() == "64x48" && Readers().size() == 2;
    exit(isRead ? 0 : 1);
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(Size(), "64x48");
  EXPECT_EQ(Readers(), readers);
}

TEST_F(HeaderReader, MayBeStartedByAThreadThatEnds) {
  for (int i = 0; i < 20; ++i) {
    std::string size;
    std::thread([&size] { size = Size(); }).join();
    EXPECT_EQ(size, "64x48");
    EXPECT_EQ(Size(), "64x48");
    EndHeaderReader();
  }
}

TEST_F(HeaderReader, AnswersThreadsThatComeAndGo) {
  MakePpm("/tmp/b.ppm", 61, 19);
  std::vector<std::thread> threads;
  for (int number = 0; number < 8; ++number) {
    threads.emplace_back([number] {
      for (int round = 0; round < 50 * number; ++round) {
        EXPECT_EQ(Size(), "64x48");
        EXPECT_EQ(Size("/tmp/b.ppm"), "61x19");
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_F(HeaderReader, ReadsFilesLargerThanItsMemory) {
  ASSERT_EQ(truncate("/tmp/a.jpg", off_t{1} << 32), 0);
  EXPECT_EQ(Size(), "64x48");
}

TEST_F(HeaderReader, DoesNotBelongToTheUserThatTheParentWorksFor) {
  if (!HasOtherUsers()) return;  // an ordinary user's sandbox
  {
    const AssumedIdentity identity({kOwner, kOwner, {}});
    ASSERT_EQ(identity.Error(), 0);
    EXPECT_EQ(Size(), "64x48");
  }
  ASSERT_EQ(Readers().size(), 1U);
  const std::string process = "/proc/" + std::to_string(*Readers().begin());
  EXPECT_THAT(ReadFile(process + "/status"),
              testing::HasSubstr("\nUid:\t65534\t65534\t65534\t65534\n"));
}

TEST_F(HeaderReader, FollowsLinksOfTrustedOwnersOnly) {
  LiftProtectionOfTmp();
  ASSERT_EQ(symlink("/tmp/a.jpg", "/tmp/link.jpg"), 0);
  EXPECT_EQ(Size("/tmp/link.jpg"), "64x48");
  if (lchown("/tmp/link.jpg", 1, 1) != 0) return;  // an ordinary user's sandbox
  EXPECT_EQ(Size("/tmp/link.jpg"), "error " + std::to_string(ELOOP));
  ASSERT_EQ(chown("/tmp/a.jpg", 1, 1), 0);
  EXPECT_EQ(Size("/tmp/link.jpg"), "64x48") << "of the owner of the photo";
  WriteFile("/tmp/text", "no image");
  const OpenedFile text = Opened("/tmp/text");
  const std::string link = "/proc/self/fd/" + std::to_string(text.file.Get());
  EXPECT_EQ(Size(link.c_str()), "error " + std::to_string(EINVAL));
}

/// Replaces the photo by a pipe and back, in a separate process, until it is destroyed.
class Replacement {
 public:
  Replacement() : process_(fork()) {
    if (process_ == 0) {
      for (;;) {
        mkfifo("/tmp/pipe", 0600);
        rename("/tmp/pipe", "/tmp/a.jpg");
        link("/tmp/kept.jpg", "/tmp/photo");
        rename("/tmp/photo", "/tmp/a.jpg");
      }
    }
  }
  ~Replacement() {
    kill(process_, SIGKILL);
    waitpid(process_, nullptr, 0);
  }
  Replacement(const Replacement&) = delete;
  Replacement& operator=(const Replacement&) = delete;

 private:
  pid_t process_;
};

TEST_F(HeaderReader, DoesNotWaitForAPipeThatReplacesThePhoto) {
  MakeJpeg("/tmp/kept.jpg");
  const Replacement replacement;
  const pid_t asking = fork();
  if (asking == 0) {
    int sizes = 0;
    for (int i = 0; i < 20000; ++i) {
      const std::string size = Size();
      const bool isExpected = size == "64x48" || size.rfind("error", 0) == 0;
      if (!isExpected) _exit(2);
      sizes += size == "64x48" ? 1 : 0;
    }
    _exit(sizes > 0 ? 0 : 1);
  }
  int status = -1;
  const bool isDone = WaitUntil([&] { return waitpid(asking, &status, WNOHANG) == asking; }) ||
                      WaitUntil([&] { return waitpid(asking, &status, WNOHANG) == asking; });
  if (!isDone) {
    kill(asking, SIGKILL);
    waitpid(asking, &status, 0);
  }
  EXPECT_TRUE(isDone) << "it waits";
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace vela_test
