#include "queue_fixture.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <thread>

#include "entry_plan.h"
#include "platform/velaindex.h"
#include "support/build_paths.h"
#include "support/images.h"
#include "support/profile_file.h"

using namespace vela;

namespace vela_test {

namespace {

constexpr const char* kRecorderPath = "/usr/vela/bin/velathumb-recorder";

bool WaitUntil(const std::function<bool()>& isTrue, int milliseconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(milliseconds);
  while (!isTrue()) {
    if (std::chrono::steady_clock::now() > end) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return true;
}

}  // namespace

void ResetQueueSandbox() {
  ResetSandbox();
  WriteProfileFile(kProfiles, {{"thumb_s", 120, 70, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 0}});
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"1\"\n");
}

void MakeEntryDirectories(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    MakeDirectories(TargetOf(entry).directory);
  }
}

void AppendToQueue(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    EXPECT_EQ(WriteIndexQueue(entry.c_str(), kQueueFile), 0) << entry;
  }
}

pid_t StartAppender(const std::string& directory, int count, const std::function<int(int)>& pause) {
  const pid_t child = fork();
  if (child != 0) {
    return child;
  }
  for (int i = 0; i < count; ++i) {
    const std::string entry = directory + '/' + std::to_string(i);
    if (WriteIndexQueue(entry.c_str(), kQueueFile) != 0) {
      _exit(1);
    }
    usleep(static_cast<useconds_t>(pause(i)));
  }
  _exit(0);
}

void Enqueue(const std::vector<std::string>& entries) {
  MakeEntryDirectories(entries);
  AppendToQueue(entries);
}

std::string Lines(const std::vector<std::string>& entries) {
  std::string text;
  for (const std::string& entry : entries) {
    text += entry + '\n';
  }
  return text;
}

void ExpectQueueDone() {
  for (const char* file : {kQueueFile, kTakenFile, kJournalFile, kLaterFile}) {
    EXPECT_FALSE(Exists(file)) << file;
  }
}

std::string QueueProgramPath() {
  return BuiltPath(VELATHUMB_QUEUE_FILE);
}

std::vector<std::string> QueueArguments(const std::string& profileFile,
                                        const std::vector<std::string>& more) {
  std::vector<std::string> arguments = {"--velathumb", VelathumbPath(), "--profile", profileFile};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

ProgramResult RunRunner(const std::vector<std::string>& more) {
  return RunProgram(QueueProgramPath(), QueueArguments(kProfiles, more));
}

Program StartRunner(const std::vector<std::string>& more) {
  return StartProgram(QueueProgramPath(), QueueArguments(kProfiles, more));
}

std::string MakePhoto(const std::string& path) {
  MakeDirectories(path.substr(0, path.rfind('/')));
  MakeJpeg(path);
  SetFileTimeFromNow(path, -60);
  return path;
}

bool HasThumb(const std::string& photo) {
  const size_t slash = photo.rfind('/');
  return IsRegularFile(photo.substr(0, slash) + "/@eaDir" + photo.substr(slash) +
                       "/VELAPHOTO_THUMB_S.jpg");
}

Descriptor HoldLock(const char* path, int flags) {
  Descriptor held(open(path, flags | O_CLOEXEC, 0644));
  EXPECT_EQ(flock(held.Get(), LOCK_EX), 0) << path;
  return held;
}

bool WaitUntilEnded(pid_t process, int milliseconds) {
  return WaitUntil([process] { return kill(process, 0) != 0 && errno == ESRCH; }, milliseconds);
}

RecordingVelathumb::RecordingVelathumb() : stub_(kRecorderPath) {
  stub_.Plan(StubPlan());
}

std::vector<std::string> RecordingVelathumb::Entries() const {
  std::vector<std::string> entries;
  for (const StubCall& call : stub_.Calls()) {
    const std::vector<std::string> parameters = call.Parameters();
    EXPECT_EQ(parameters.size(), 2U);
    EXPECT_EQ(parameters.front(), kProfiles);
    entries.push_back(parameters.back());
  }
  return entries;
}

bool RecordingVelathumb::WaitForStarts(size_t count) const {
  return WaitUntil([&] { return stub_.Calls().size() >= count; }, 60000);
}

std::vector<std::string> RecordingVelathumb::Arguments(const std::vector<std::string>& more) const {
  std::vector<std::string> arguments = {"--velathumb", kRecorderPath, "--profile", kProfiles};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return arguments;
}

ProgramResult RecordingVelathumb::Run(const std::vector<std::string>& more) const {
  return RunProgram(QueueProgramPath(), Arguments(more));
}

Program RecordingVelathumb::Start(const std::vector<std::string>& more) const {
  return StartProgram(QueueProgramPath(), Arguments(more));
}

std::string QueueTest::ExpectRun(const std::vector<std::string>& entries) const {
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_EQ(velathumb_.Entries(), entries);
  ExpectQueueDone();
  return result.err;
}

void QueueTest::ConvertQueue() {
  EXPECT_EQ(RunRunner().exitCode, 0);
  ExpectQueueDone();
}

Program QueueTest::StartAndHold(const std::vector<std::string>& entries) {
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  Enqueue(entries);
  Program runner = velathumb_.Start();
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  return runner;
}

void QueueTest::Release() {
  WriteFile("/tmp/go", "");
}

void QueueTest::ExpectEnd(Program& runner, int exitCode, std::chrono::seconds limit) {
  const auto result = runner.Wait(limit);
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, exitCode) << result->err;
}

void QueueTest::Stop(Program& runner) {
  runner.Kill(SIGTERM);
  ExpectEnd(runner, 1, std::chrono::seconds(5));
}

}  // namespace vela_test
