#include "posix/log.h"

#include <paths.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <syslog.h>

#include <cstdio>
#include <cstring>

namespace vela {

static_assert(kErrorPriority == LOG_ERR);

namespace {

/// LOG_USER | LOG_ERR. Without a time: every log knows when it receives a message.
constexpr std::string_view kHeader = "<11>";
static_assert((LOG_USER | LOG_ERR) == 11);

/// How long a log that is busy may delay a message.
constexpr timeval kLongestSend = {2, 0};

}  // namespace

void LogError(std::string_view source, int line, std::string_view text) {
  syslog(LOG_ERR, "%.*s:%d %.*s", static_cast<int>(source.size()), source.data(), line,
         static_cast<int>(text.size()), text.data());
}

void LogError(std::string_view text) {
  syslog(LOG_ERR, "%.*s", static_cast<int>(text.size()), text.data());
}

LogConnection::LogConnection() : socket_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  static_assert(sizeof _PATH_LOG <= sizeof address.sun_path);
  std::memcpy(address.sun_path, _PATH_LOG, sizeof _PATH_LOG);
  if (connect(socket_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    socket_.Reset();
  }
}

void LogConnection::SendError(std::string_view line) const {
  setsockopt(socket_.Get(), SOL_SOCKET, SO_SNDTIMEO, &kLongestSend, sizeof kLongestSend);
  iovec parts[] = {{const_cast<char*>(kHeader.data()), kHeader.size()},
                   {const_cast<char*>(line.data()), line.size()}};
  // Unlike sendmsg, this cannot name another receiver, so a sandbox can allow it.
  const ssize_t sent = writev(socket_.Get(), parts, 2);
  static_cast<void>(sent);  // there is no other place to report it
}

std::string LogText(const char* text) {
  return text == nullptr ? "(null)" : text;
}

std::string LogCode(int code) {
  char text[16] = "";
  std::snprintf(text, sizeof text, "0x%04X", static_cast<unsigned>(code));
  return text;
}

}  // namespace vela
