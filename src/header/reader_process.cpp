#include "header/reader_process.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>

#include "posix/child_process.h"
#include "posix/deadline.h"
#include "posix/identity.h"
#include "posix/local_socket.h"
#include "posix/log.h"

namespace vela {

namespace {

namespace fs = std::filesystem;

constexpr char kProgram[] = "libexec/velathumb/header-reader";
/// For a program that is not installed together with the header reader.
constexpr char kUsualPlace[] = "/usr/libexec/velathumb/header-reader";

constexpr std::chrono::seconds kEndLimit(1);

/// Returns the path of the header reader, which is installed below one of the directories that this
/// program is in; empty when it is nowhere.
std::string FindProgram() {
  std::error_code error;
  const fs::path self = fs::read_symlink("/proc/self/exe", error);
  for (fs::path directory = self.parent_path(); directory.has_relative_path();
       directory = directory.parent_path()) {
    const fs::path path = directory / kProgram;
    if (IsProgramToTrust(path)) {
      return path;
    }
  }
  return IsProgramToTrust(kUsualPlace) ? kUsualPlace : "";
}

/// Returns 0 or an errno value.
int StartProgram(std::string path, int socket, pid_t& pid) {
  if (path.empty()) {
    return ENOENT;
  }
  char* const arguments[] = {path.data(), nullptr};
  ChildStreams streams;
  streams.standardOutput = socket;
  static_assert(kQuestionSocket == 1, "the socket is the standard output");
  // It confines itself, more than would be possible before its libraries are loaded.
  Confinement confinement;
  confinement.blocksSystemCalls = false;
  return StartChild(path.c_str(), arguments, streams, confinement, pid);
}

std::string_view BytesOf(const HeaderQuestion& question) {
  return {reinterpret_cast<const char*>(&question), sizeof question};
}

bool IsGone(pid_t pid) {
  return ReapEndedChild(pid).has_value();
}

}  // namespace

std::optional<HeaderAnswer> ReaderProcess::Ask(HeaderTopic topic, const OpenedFile& file) {
  const std::lock_guard<std::mutex> lock(mutex_);
  AbandonInherited();
  KeepUsersApart(file);
  const bool isNew = !socket_.IsOpen();
  if (isNew && !Start()) {
    return std::nullopt;
  }
  HeaderAnswer answer;
  Outcome outcome = Exchange(topic, file, answer);
  // It ends by itself after some time, and with the thread that has started it. That is not the
  // fault of this file.
  if (outcome == Outcome::kEnded && !isNew) {
    Stop();
    outcome = Start() ? Exchange(topic, file, answer) : Outcome::kFailed;
  }
  if (outcome != Outcome::kAnswer) {
    Stop();
    return std::nullopt;
  }
  return answer;
}

void ReaderProcess::End() {
  const std::lock_guard<std::mutex> lock(mutex_);
  AbandonInherited();
  if (!socket_.IsOpen()) {
    return;
  }
  socket_.Reset();
  AwaitChildFor(pid_, kEndLimit);
  Stop();
}

bool ReaderProcess::Start() {
  ending_.erase(std::remove_if(ending_.begin(), ending_.end(), IsGone), ending_.end());
  if (program_.empty()) {
    program_ = FindProgram();
  }
  // It survives the work for a user, who could otherwise trace it.
  const OwnIdentity own;
  MessageSockets sockets = ConnectMessageSockets();
  const int error =
      sockets.own.IsOpen() ? StartProgram(program_, sockets.other.Get(), pid_) : errno;
  if (error == 0) {
    socket_ = std::move(sockets.own);
    runsAs_ = FileUser();
    parent_ = getpid();
    return true;
  }
  if (!hasLoggedFailure_) {
    hasLoggedFailure_ = true;
    LogError(std::string(kProgram) + " cannot be started: " + std::strerror(error));
  }
  return false;
}

/// Does not wait long: a process that reads from a file system that does not respond cannot be
/// killed.
void ReaderProcess::Stop() {
  socket_.Reset();
  if (pid_ == 0) {
    return;
  }
  KillChild(pid_);
  if (!AwaitChildFor(pid_, kEndLimit) || !IsGone(pid_)) {
    ending_.push_back(pid_);
  }
  pid_ = 0;
}

/// After a fork, the process belongs to the parent.
void ReaderProcess::AbandonInherited() {
  if (parent_ == 0 || parent_ == getpid()) {
    return;
  }
  socket_.Reset();
  user_.reset();
  ending_.clear();
  pid_ = 0;
  parent_ = 0;
}

/// A file that has taken over the process could give wrong answers about the files that follow, and
/// so could the user as whom it runs. Those of other users are therefore read by a new process.
void ReaderProcess::KeepUsersApart(const OpenedFile& file) {
  if (socket_.IsOpen() && runsAs_ != FileUser()) {
    Stop();
  }
  if (file.owner == FileUser()) {
    return;
  }
  if (user_ && *user_ != file.owner) {
    Stop();
  }
  user_ = file.owner;
}

ReaderProcess::Outcome ReaderProcess::Exchange(HeaderTopic topic, const OpenedFile& file,
                                               HeaderAnswer& answer) const {
  const HeaderQuestion question{topic};
  const Deadline deadline(limit_);
  if (SendDescriptor(socket_.Get(), BytesOf(question), file.file.Get()) != 0) {
    return Outcome::kEnded;
  }
  size_t got = 0;
  const int error =
      ReceiveSome(socket_.Get(), reinterpret_cast<char*>(&answer), sizeof answer, deadline, got);
  if (error == ETIMEDOUT) {
    return Outcome::kFailed;
  }
  if (error != 0 || got == 0) {
    return Outcome::kEnded;
  }
  answer.orientation[kOrientationTextSize - 1] = '\0';
  return got == sizeof answer ? Outcome::kAnswer : Outcome::kFailed;
}

}  // namespace vela
