#include "support/system_log.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <cstring>
#include <mutex>

#include "support/environment_failure.h"
#include "support/quiet_thread.h"

namespace vela_test {

namespace {

// The socket itself; /dev/log is a second name of it, so that a test may remove that one and have
// it restored without breaking connections.
constexpr const char* kSocket = "/.log";
constexpr const char* kLogPath = "/dev/log";
// No log message begins like this.
constexpr const char* kMarkerBeginning = "\001marker ";
constexpr size_t kLargestMessage = 1 << 20;
constexpr size_t kTimestampLength = 16;  // "Mmm dd hh:mm:ss "

/// Removes "<number>" from the beginning and returns the number; -1 when there is none.
int TakePriority(std::string* text) {
  const size_t end = text->find('>');
  if (text->empty() || text->front() != '<' || end == std::string::npos || end < 2 || end > 4) {
    return -1;
  }
  const int priority = std::atoi(text->substr(1, end - 1).c_str());
  text->erase(0, end + 1);
  return priority;
}

bool HasTimestamp(const std::string& text) {
  return text.size() >= kTimestampLength && text[3] == ' ' && text[6] == ' ' && text[9] == ':' &&
         text[12] == ':' && text[15] == ' ';
}

LogMessage ParseMessage(std::string text, pid_t sender) {
  LogMessage message;
  message.pid = sender;
  const int priority = TakePriority(&text);
  if (priority >= 0) {
    message.priority = LOG_PRI(priority);
    message.facility = priority & LOG_FACMASK;
  }
  if (HasTimestamp(text)) {
    text.erase(0, kTimestampLength);
    const size_t colon = text.find(": ");
    if (colon != std::string::npos) {
      message.identity = text.substr(0, colon);
      text.erase(0, colon + 2);
    }
  }
  message.text = text;
  return message;
}

sockaddr_un SocketAddress() {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, kSocket, sizeof address.sun_path - 1);
  return address;
}

pid_t SenderOf(msghdr* header) {
  for (cmsghdr* part = CMSG_FIRSTHDR(header); part != nullptr; part = CMSG_NXTHDR(header, part)) {
    if (part->cmsg_level == SOL_SOCKET && part->cmsg_type == SCM_CREDENTIALS) {
      ucred credentials{};
      std::memcpy(&credentials, CMSG_DATA(part), sizeof credentials);
      return credentials.pid;
    }
  }
  return 0;
}

/// Receives on its own thread, so that no sender ever waits for the test.
class Recorder {
 public:
  Recorder() : socket_(BoundSocket()), sender_(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
    if (sender_ < 0) {
      EnvironmentFailureWithErrno("cannot make a socket");
    }
    StartQuietThread([this] { Read(); }).detach();
  }

  void RestoreName() const {
    struct stat socketStatus {};
    struct stat nameStatus {};
    const bool isThere = lstat(kSocket, &socketStatus) == 0 && lstat(kLogPath, &nameStatus) == 0 &&
                         socketStatus.st_ino == nameStatus.st_ino;
    if (isThere) {
      return;
    }
    unlink(kLogPath);
    if (link(kSocket, kLogPath) != 0) {
      EnvironmentFailureWithErrno("cannot make /dev/log");
    }
  }

  std::vector<LogMessage> Messages() {
    Synchronise();
    const std::lock_guard<std::mutex> lock(mutex_);
    return messages_;
  }

  void Clear() {
    Synchronise();
    const std::lock_guard<std::mutex> lock(mutex_);
    messages_.clear();
  }

 private:
  static int BoundSocket() {
    const int made = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    const sockaddr_un address = SocketAddress();
    const int on = 1;
    if (made < 0 || bind(made, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        chmod(kSocket, 0666) != 0 ||
        setsockopt(made, SOL_SOCKET, SO_PASSCRED, &on, sizeof on) != 0) {
      EnvironmentFailureWithErrno("cannot make the system log of the sandbox");
    }
    return made;
  }

  [[noreturn]] void Read() {
    std::vector<char> buffer(kLargestMessage);
    for (;;) {
      alignas(cmsghdr) char control[CMSG_SPACE(sizeof(ucred))];
      iovec part = {buffer.data(), buffer.size()};
      msghdr header{};
      header.msg_iov = &part;
      header.msg_iovlen = 1;
      header.msg_control = control;
      header.msg_controllen = sizeof control;
      const ssize_t length = recvmsg(socket_, &header, 0);
      if (length >= 0) {
        Take(std::string(buffer.data(), static_cast<size_t>(length)), SenderOf(&header));
      }
    }
  }

  void Take(const std::string& text, pid_t sender) {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (text.compare(0, std::strlen(kMarkerBeginning), kMarkerBeginning) == 0) {
      seenMarker_ = std::strtoull(text.c_str() + std::strlen(kMarkerBeginning), nullptr, 10);
      markerSeen_.notify_all();
      return;
    }
    messages_.push_back(ParseMessage(text, sender));
  }

  /// Datagrams of one socket arrive in the order in which they were sent: once the reader has seen
  /// a marker sent now, it has seen everything logged before.
  void Synchronise() {
    std::unique_lock<std::mutex> lock(mutex_);
    const unsigned long long marker = ++sentMarker_;
    lock.unlock();
    const std::string text = kMarkerBeginning + std::to_string(marker);
    const sockaddr_un address = SocketAddress();
    if (sendto(sender_, text.data(), text.size(), MSG_NOSIGNAL,
               reinterpret_cast<const sockaddr*>(&address), sizeof address) < 0) {
      EnvironmentFailureWithErrno("cannot reach the system log of the sandbox");
    }
    lock.lock();
    const bool seen =
        markerSeen_.wait_for(lock, std::chrono::seconds(60), [&] { return seenMarker_ >= marker; });
    if (!seen) {
      EnvironmentFailure("the recorder of the system log does not answer");
    }
  }

  const int socket_;
  const int sender_;
  std::mutex mutex_;
  std::condition_variable markerSeen_;
  std::vector<LogMessage> messages_;
  unsigned long long sentMarker_ = 0;
  unsigned long long seenMarker_ = 0;
};

/// Never destroyed: its thread reads until the process ends.
Recorder& TheRecorder() {
  static Recorder* recorder = new Recorder;
  return *recorder;
}

}  // namespace

std::vector<LogMessage> LogMessages() {
  return TheRecorder().Messages();
}

std::vector<std::string> ErrorLines() {
  std::vector<std::string> lines;
  for (const LogMessage& message : LogMessages()) {
    const bool isError = message.priority == LOG_ERR;
    lines.push_back(isError ? message.text
                            : "<" + std::to_string(message.priority) + "> " + message.text);
  }
  return lines;
}

void ClearLog() {
  TheRecorder().Clear();
}

void StartLogRecorder() {
  TheRecorder().RestoreName();
}

}  // namespace vela_test
