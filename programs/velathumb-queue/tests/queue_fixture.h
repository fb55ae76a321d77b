// The files and runs that the tests of the runner share, and a velathumb that only records.
#pragma once

#include <gmock/gmock.h>

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include "support/descriptor.h"
#include "support/files.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {

constexpr const char* kQueueFile = "/var/spool/thumb_create.queue";
constexpr const char* kTakenFile = "/var/spool/thumb_create.queue.tmp";
constexpr const char* kJournalFile = "/var/spool/thumb_create.queue.done";
constexpr const char* kLaterFile = "/var/spool/thumb_create.queue.later";
constexpr const char* kProfiles = "/tmp/profiles.conf";

/// Resets the sandbox, then writes one profile (S, phase 0) and settings that request only that
/// class.
void ResetQueueSandbox();

/// Makes the directories of the entries.
void MakeEntryDirectories(const std::vector<std::string>& entries);

/// Appends the entries to the queue as velathumb does, whether or not the directories exist.
void AppendToQueue(const std::vector<std::string>& entries);

/// Starts a process that appends the entries `directory`/0, /1 and so on and pauses for pause(i)
/// microseconds after each. It exits with status 0 when all were appended.
pid_t StartAppender(const std::string& directory, int count, const std::function<int(int)>& pause);

/// Makes the directories and appends the entries.
void Enqueue(const std::vector<std::string>& entries);

/// The entries as lines of a file.
std::string Lines(const std::vector<std::string>& entries);

/// Fails the test when a file of the queue is left.
void ExpectQueueDone();

/// The runner as its users start it.
std::string QueueProgramPath();

/// The options for running the velathumb of this build with this profile file.
std::vector<std::string> QueueArguments(const std::string& profileFile,
                                        const std::vector<std::string>& more = {});

/// Runs or starts the runner with the velathumb that was built.
ProgramResult RunRunner(const std::vector<std::string>& more = {});
Program StartRunner(const std::vector<std::string>& more = {});

/// Makes a photo that is a minute old; directories on the way are made. Returns `path`.
std::string MakePhoto(const std::string& path);

/// Whether the photo has its thumbnail of class S.
bool HasThumb(const std::string& photo);

/// Opens the file or directory with these flags and locks it.
Descriptor HoldLock(const char* path, int flags);

/// Waits until the process is gone, at most `milliseconds`; returns whether it is.
bool WaitUntilEnded(pid_t process, int milliseconds = 5000);

/// A stub in place of velathumb: records its arguments and does nothing unless it has a plan.
class RecordingVelathumb {
 public:
  RecordingVelathumb();

  StubTool& Stub() { return stub_; }

  /// The entries it was started with, in the order of the starts.
  std::vector<std::string> Entries() const;

  /// Waits until it has been started `count` times, at most 10 s; returns whether it has.
  bool WaitForStarts(size_t count) const;

  /// The options that make the runner use this velathumb.
  std::vector<std::string> Arguments(const std::vector<std::string>& more = {}) const;

  /// Runs or starts the runner with this velathumb.
  ProgramResult Run(const std::vector<std::string>& more = {}) const;
  Program Start(const std::vector<std::string>& more = {}) const;

 private:
  StubTool stub_;
};

/// Resets the sandbox before the members of derived fixtures are made.
class QueueSandboxTest : public SandboxTest {
 protected:
  QueueSandboxTest() { ResetQueueSandbox(); }
  void SetUp() override {}
};

/// Every test has the profile and settings of ResetQueueSandbox and a recording velathumb.
class QueueTest : public QueueSandboxTest {
 protected:
  /// Runs the runner with the recording velathumb. Fails the test unless the run succeeds,
  /// velathumb has then been started for exactly these entries since the beginning of the test, and
  /// the queue is done. Returns what the runner printed to standard error.
  std::string ExpectRun(const std::vector<std::string>& entries) const;

  /// Runs the runner with the velathumb that was built. Fails the test unless the run succeeds and
  /// the queue is done.
  static void ConvertQueue();

  /// Enqueues the entries, starts the runner and waits until velathumb has been started for the
  /// first one, which does not end before Release.
  Program StartAndHold(const std::vector<std::string>& entries);
  static void Release();

  /// Fails the test unless the runner ends with this status in time.
  static void ExpectEnd(Program& runner, int exitCode,
                        std::chrono::seconds limit = std::chrono::seconds(20));

  /// Sends SIGTERM, and fails the test unless the runner ends with status 1 within 5 s.
  static void Stop(Program& runner);

  RecordingVelathumb velathumb_;
};

}  // namespace vela_test
