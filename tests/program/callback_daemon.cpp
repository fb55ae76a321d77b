#include "program/callback_daemon.h"

#include <json/reader.h>
#include <json/value.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <memory>
#include <utility>

#include "support/daemon_peer.h"
#include "support/environment_failure.h"

namespace vela_test {

namespace {

constexpr int kLookMilliseconds = 20;

int ListenAtDaemonSocket() {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, kDaemonSocket, sizeof address.sun_path - 1);
  const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (listener < 0 ||
      bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      listen(listener, 16) != 0) {
    EnvironmentFailureWithErrno("cannot listen at the daemon's socket");
  }
  return listener;
}

std::string ReadLine(int connection) {
  std::string line;
  char c = 0;
  while (read(connection, &c, 1) == 1 && c != '\n') {
    line += c;
  }
  return line;
}

Json::Value Parse(const std::string& text) {
  Json::Value value;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
  return value;
}

}  // namespace

CallbackDaemon::CallbackDaemon(Answer answer)
    : answer_(std::move(answer)),
      listener_(ListenAtDaemonSocket()),
      thread_(&CallbackDaemon::Serve, this) {}

CallbackDaemon::~CallbackDaemon() {
  Stop();
}

void CallbackDaemon::Stop() {
  stopped_ = true;
  if (thread_.joinable()) {
    thread_.join();
    close(listener_);
    unlink(kDaemonSocket);
  }
}

void CallbackDaemon::Serve() {
  while (!stopped_) {
    pollfd waiting = {listener_, POLLIN, 0};
    if (poll(&waiting, 1, kLookMilliseconds) != 1) {
      continue;
    }
    const int connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (connection >= 0) {
      AnswerOne(connection);
      close(connection);
    }
  }
}

void CallbackDaemon::AnswerOne(int connection) const {
  const Json::Value request = Parse(ReadLine(connection));
  const std::string reply =
      answer_(request["command"].asString(), request["path"].asString()) + "\n";
  send(connection, reply.data(), reply.size(), MSG_NOSIGNAL);
}

}  // namespace vela_test
