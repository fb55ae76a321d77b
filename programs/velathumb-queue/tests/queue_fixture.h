// What the tests of the runner share: its files, its runs, and a velathumb that only records.
#pragma once

#include <string>
#include <vector>

#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace vela_test {

constexpr const char* kQueueFile = "/var/spool/thumb_create.queue";
constexpr const char* kTakenFile = "/var/spool/thumb_create.queue.tmp";
constexpr const char* kJournalFile = "/var/spool/thumb_create.queue.done";
constexpr const char* kLaterFile = "/var/spool/thumb_create.queue.later";
constexpr const char* kProfiles = "/tmp/profiles.conf";

/// Every test starts with one profile (S, phase 0) and with settings that ask for that class only.
/// The sandbox is reset before the members of the tests' own fixtures are made.
class QueueTest : public SandboxTest {
 protected:
  QueueTest();
  void SetUp() override {}
};

/// Resets the sandbox and writes that profile and these settings.
void ResetQueueSandbox();

/// Makes the directories that the entries stand for.
void MakeEntryDirectories(const std::vector<std::string>& entries);

/// Appends the entries to the queue as velathumb does, whatever they stand for.
void AppendToQueue(const std::vector<std::string>& entries);

/// Makes the directories and appends the entries.
void Enqueue(const std::vector<std::string>& entries);

/// The entries as lines of a file.
std::string Lines(const std::vector<std::string>& entries);

/// Fails the test when anything is left of the queue.
void ExpectNothingWaits();

/// Runs the runner, or starts it, with the velathumb that was built.
ProgramResult RunRunner(const std::vector<std::string>& more = {});
Program StartRunner(const std::vector<std::string>& more = {});

/// Makes a photo that is a minute old; directories on the way are made. Returns `path`.
std::string MakePhoto(const std::string& path);

/// Whether the photo has its thumbnail of class S.
bool HasThumb(const std::string& photo);

/// Waits until the process is gone, at most `milliseconds`; whether it went.
bool WaitUntilEnded(pid_t process, int milliseconds = 5000);

/// A stub in place of velathumb: records what it is started with, does nothing unless told so.
class RecordingVelathumb {
 public:
  RecordingVelathumb();

  StubTool& Stub() { return stub_; }

  /// The entries it was started with, in the order of the starts.
  std::vector<std::string> Entries() const;

  /// Waits until it has been started `count` times, at most 10 s; whether it was.
  bool WaitForStarts(size_t count) const;

  /// The options that make the runner use this velathumb.
  std::vector<std::string> Arguments(const std::vector<std::string>& more = {}) const;

  /// Runs the runner, or starts it, with this velathumb.
  ProgramResult Run(const std::vector<std::string>& more = {}) const;
  Program Start(const std::vector<std::string>& more = {}) const;

 private:
  StubTool stub_;
};

}  // namespace vela_test
