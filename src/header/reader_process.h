// The process of the header reader, seen from the program that asks.
#pragma once

#include <chrono>
#include <cstdint>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "header/header_question.h"
#include "posix/child_process.h"
#include "posix/file_descriptor.h"
#include "posix/folder.h"

namespace vela {

/// Owns at most one process. Threads may share an object; it answers one question at a time.
class ReaderProcess {
 public:
  /// How long an answer may take: long enough for a disk that has to start spinning.
  static constexpr std::chrono::seconds kAnswerLimit{30};

  /// The process will run `program`, by default the installed header reader, and is killed when an
  /// answer takes longer than `limit`.
  explicit ReaderProcess(std::string program = {}, std::chrono::seconds limit = kAnswerLimit)
      : program_(std::move(program)), limit_(limit) {}
  ReaderProcess(const ReaderProcess&) = delete;
  ReaderProcess& operator=(const ReaderProcess&) = delete;

  /// Returns the answer about an open file, nothing when the process crashes, does not answer in
  /// time or cannot be started. Starts a process if none runs.
  std::optional<HeaderAnswer> Ask(HeaderTopic topic, const OpenedFile& file);

  /// Ends the process, if any.
  void End();

 private:
  enum class Outcome {
    kAnswer,
    kEnded,   ///< the process has ended
    kFailed,  ///< no answer in time, or one that is invalid
  };

  bool Start();
  void Stop();
  void AbandonInherited();
  void KeepUsersApart(const OpenedFile& file);
  Outcome Exchange(HeaderTopic topic, const OpenedFile& file, HeaderAnswer& answer) const;

  std::mutex mutex_;
  std::string program_;
  std::chrono::seconds limit_;
  FileDescriptor socket_;
  pid_t pid_ = 0;
  pid_t parent_ = 0;              // the process that has started it
  uint32_t runsAs_ = 0;           // the user of the process
  std::optional<uint32_t> user_;  // whose files it has read
  std::vector<pid_t> ending_;     // killed, but not gone yet
  bool hasLoggedFailure_ = false;
};

}  // namespace vela
