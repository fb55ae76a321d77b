#include "answering_daemon.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <string_view>

#include "ipc/velamk_ipc.h"
#include "timed_run.h"

namespace vela_bench {

namespace {

constexpr int kBacklog = 16;
constexpr std::string_view kReply = "{\"success\":true,\"version\":0}\n";

int Listen() {
  const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, PluginDaemonSocketPath, sizeof address.sun_path - 1);
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  if (bind(listener, generic, sizeof address) != 0 || listen(listener, kBacklog) != 0) {
    Fail("cannot listen for requests");
  }
  return listener;
}

}  // namespace

AnsweringDaemon::AnsweringDaemon() : listener_(Listen()), thread_([this] { Serve(); }) {}

AnsweringDaemon::~AnsweringDaemon() {
  shutdown(listener_, SHUT_RDWR);
  thread_.join();
  close(listener_);
  unlink(PluginDaemonSocketPath);
}

void AnsweringDaemon::Serve() const {
  for (;;) {
    const int connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (connection < 0) {
      return;
    }
    char request[16384];
    if (recv(connection, request, sizeof request, 0) > 0) {
      send(connection, kReply.data(), kReply.size(), MSG_NOSIGNAL);
    }
    close(connection);
  }
}

}  // namespace vela_bench
