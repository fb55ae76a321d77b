#include "support/daemon_peer.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <condition_variable>
#include <cstring>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <thread>
#include <utility>

#include "support/descriptor.h"
#include "support/environment_failure.h"
#include "support/quiet_thread.h"
#include "support/stub_tool.h"

namespace vela_test {

namespace {

constexpr int kNoLimit = -1;

/// The unparsed string value of "command" in the request's text.
std::string CommandIn(const std::string& request) {
  const std::string key = "\"command\"";
  size_t position = request.find(key);
  if (position == std::string::npos) {
    return "";
  }
  const size_t begin = request.find('"', position + key.size());
  const size_t end = begin == std::string::npos ? begin : request.find('"', begin + 1);
  return end == std::string::npos ? "" : request.substr(begin + 1, end - begin - 1);
}

std::string VersionAnswer(int version) {
  return "{\"success\":true,\"version\":" + std::to_string(version) + "}";
}

/// A connection, closed with its object.
class Connection {
 public:
  /// `stop` becomes readable when the daemon ends; every wait ends then too.
  Connection(int socket, int stop) : socket_(socket), stop_(stop) {}

  /// Reads everything up to the first newline or the end.
  std::string ReadRequest() const {
    std::string request;
    while (request.find('\n') == std::string::npos && WaitFor(POLLIN)) {
      char buffer[65536];
      const ssize_t count = recv(socket_.Get(), buffer, sizeof buffer, MSG_DONTWAIT);
      if (count <= 0) {
        break;
      }
      request.append(buffer, static_cast<size_t>(count));
    }
    return request;
  }

  bool Send(const std::string& bytes) const {
    size_t done = 0;
    while (done < bytes.size()) {
      const ssize_t sent = WaitFor(POLLOUT) ? send(socket_.Get(), bytes.data() + done,
                                                   bytes.size() - done, MSG_NOSIGNAL | MSG_DONTWAIT)
                                            : -1;
      if (sent < 0) {
        return false;
      }
      done += static_cast<size_t>(sent);
    }
    return true;
  }

  void WaitForClosing() const {
    char byte = 0;
    while (WaitFor(POLLIN) && recv(socket_.Get(), &byte, 1, MSG_DONTWAIT) > 0) {
    }
  }

  /// Waits; returns whether the daemon is still running.
  bool Pause(int milliseconds) const {
    pollfd stop = {stop_, POLLIN, 0};
    return milliseconds <= 0 || poll(&stop, 1, milliseconds) == 0;
  }

 private:
  bool WaitFor(short events) const {
    pollfd waiting[] = {{socket_.Get(), events, 0}, {stop_, POLLIN, 0}};
    while (poll(waiting, 2, kNoLimit) < 0 && errno == EINTR) {
    }
    return waiting[1].revents == 0;
  }

  const Descriptor socket_;
  const int stop_;
};

}  // namespace

class DaemonPeer::Server {
 public:
  explicit Server(std::string path)
      : path_(std::move(path)), listener_(Listen(path_)), stop_(eventfd(0, EFD_CLOEXEC)) {
    if (!stop_.IsOpen()) {
      EnvironmentFailureWithErrno("cannot make an event descriptor");
    }
    const DaemonReply notDisabled = DaemonReply::Line("{\"success\":true,\"result\":false}");
    byCommand_ = {
        {"GET_MEDIA_FROM_PLUGIN_DB", DaemonReply::Line("{\"success\":true,\"media\":{}}")},
        {"GET_INDEX_VERSION", DaemonReply::Line(VersionAnswer(0))},
        {"IS_DISABLE_CONVERT_VIDEO", notDisabled},
        {"IS_DISABLE_CONVERT_PHOTO", notDisabled}};
    acceptor_ = StartQuietThread([this] { Accept(); });
  }

  ~Server() {
    eventfd_write(stop_.Get(), 1);
    acceptor_.join();
    for (std::thread& connection : connections_) {
      connection.join();
    }
    unlink(path_.c_str());
  }

  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;

  std::mutex mutex_;  // for the members below
  std::condition_variable requestCame_;
  std::vector<DaemonRequest> requests_;
  std::map<std::string, DaemonReply> byCommand_;
  std::deque<DaemonReply> next_;
  size_t accepted_ = 0;

 private:
  static Descriptor Listen(const std::string& path) {
    constexpr int kBacklog = 64;
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    unlink(path.c_str());
    Descriptor listener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    if (!listener.IsOpen() ||
        bind(listener.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        chmod(path.c_str(), 0777) != 0 || listen(listener.Get(), kBacklog) != 0) {
      EnvironmentFailureWithErrno("cannot listen at " + path);
    }
    return listener;
  }

  void Accept() {
    for (;;) {
      pollfd waiting[] = {{listener_.Get(), POLLIN, 0}, {stop_.Get(), POLLIN, 0}};
      if (poll(waiting, 2, kNoLimit) < 0 && errno != EINTR) {
        return;
      }
      if (waiting[1].revents != 0) {
        return;
      }
      const int accepted = accept4(listener_.Get(), nullptr, nullptr, SOCK_CLOEXEC);
      if (accepted >= 0) {
        const std::optional<DaemonReply> scripted = TakeNext();
        // The threads inherit this one's blocked signals.
        connections_.emplace_back([this, accepted, scripted] { Serve(accepted, scripted); });
      }
    }
  }

  std::optional<DaemonReply> TakeNext() {
    const std::lock_guard<std::mutex> lock(mutex_);
    ++accepted_;
    if (next_.empty()) {
      return std::nullopt;
    }
    DaemonReply reply = next_.front();
    next_.pop_front();
    return reply;
  }

  void Serve(int accepted, const std::optional<DaemonReply>& scripted) {
    const Connection connection(accepted, stop_.Get());
    if (scripted && !scripted->readRequest_) {
      connection.Pause(scripted->delayMilliseconds_);
      return;
    }
    const std::string bytes = connection.ReadRequest();
    if (!bytes.empty()) {
      const DaemonRequest request = Note(bytes);
      Reply(connection, request, scripted ? *scripted : ReplyFor(request.command));
    }
  }

  DaemonRequest Note(const std::string& bytes) {
    DaemonRequest request = {bytes, CommandIn(bytes), NextSequence()};
    const std::lock_guard<std::mutex> lock(mutex_);
    requests_.push_back(request);
    requestCame_.notify_all();
    return request;
  }

  DaemonReply ReplyFor(const std::string& command) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = byCommand_.find(command);
    return found != byCommand_.end() ? found->second : DaemonReply::Line("{\"success\":true}");
  }

  static void Reply(const Connection& connection, const DaemonRequest& request,
                    const DaemonReply& reply) {
    if (reply.action_) {
      reply.action_(request);
    }
    if (!connection.Pause(reply.delayMilliseconds_)) {
      return;
    }
    if (reply.byteByByte_) {
      SendSlowly(connection, reply);
    } else {
      connection.Send(reply.bytes_);
    }
    if (reply.keepOpen_) {
      connection.WaitForClosing();
    }
  }

  static void SendSlowly(const Connection& connection, const DaemonReply& reply) {
    for (const char byte : reply.bytes_) {
      if (!connection.Send(std::string(1, byte)) || !connection.Pause(reply.pauseMilliseconds_)) {
        return;
      }
    }
  }

  const std::string path_;
  const Descriptor listener_;
  const Descriptor stop_;
  std::vector<std::thread> connections_;  // used only by the accepting thread until it has ended
  std::thread acceptor_;
};

DaemonPeer::DaemonPeer(const std::string& socketPath)
    : server_(std::make_unique<Server>(socketPath)) {}

DaemonPeer::~DaemonPeer() = default;

void DaemonPeer::Answer(const std::string& command, const DaemonReply& reply) {
  const std::lock_guard<std::mutex> lock(server_->mutex_);
  server_->byCommand_[command] = reply;
}

void DaemonPeer::AnswerNext(const DaemonReply& reply) {
  const std::lock_guard<std::mutex> lock(server_->mutex_);
  server_->next_.push_back(reply);
}

void DaemonPeer::SetIndexVersion(int version) {
  Answer("GET_INDEX_VERSION", DaemonReply::Line(VersionAnswer(version)));
}

std::vector<DaemonRequest> DaemonPeer::Requests() const {
  const std::lock_guard<std::mutex> lock(server_->mutex_);
  return server_->requests_;
}

std::vector<std::string> DaemonPeer::Commands() const {
  std::vector<std::string> commands;
  for (const DaemonRequest& request : Requests()) {
    commands.push_back(request.command);
  }
  return commands;
}

bool DaemonPeer::WaitForRequests(size_t count, int milliseconds) const {
  std::unique_lock<std::mutex> lock(server_->mutex_);
  return server_->requestCame_.wait_for(lock, std::chrono::milliseconds(milliseconds),
                                        [&] { return server_->requests_.size() >= count; });
}

size_t DaemonPeer::Connections() const {
  const std::lock_guard<std::mutex> lock(server_->mutex_);
  return server_->accepted_;
}

}  // namespace vela_test
