#include <json/value.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <exception>
#include <string>
#include <string_view>
#include <utility>

#include "index/strict_json.h"
#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"
#include "posix/deadline.h"
#include "posix/file_descriptor.h"
#include "posix/local_socket.h"

namespace {

using vela::Deadline;
using vela::FileDescriptor;

constexpr size_t kReplyMax = 1024 * 1024;
constexpr size_t kChunkSize = 16384;

/// Receives up to the newline or the end of the connection. Returns 0 or an errno value.
int ReceiveLine(int fd, const Deadline& deadline, std::string& line) {
  char chunk[kChunkSize];
  for (;;) {
    size_t got = 0;
    const int error = vela::ReceiveSome(fd, chunk, sizeof(chunk), deadline, got);
    if (error != 0) {
      return error;
    }
    if (got == 0) {
      return 0;
    }
    const std::string_view piece(chunk, got);
    const size_t newline = piece.find('\n');
    line.append(piece.substr(0, newline));
    if (line.size() > kReplyMax) {
      return EMSGSIZE;
    }
    if (newline != std::string_view::npos) {
      return 0;
    }
    // A peer that sends byte by byte would otherwise restart the wait each time.
    if (deadline.Left() == std::chrono::nanoseconds::zero()) {
      return ETIMEDOUT;
    }
  }
}

/// Returns 0 and the reply, or an errno value.
int Exchange(const char* socketPath, const Json::Value& request, const Deadline& deadline,
             Json::Value& reply) {
  FileDescriptor connection;
  int error = vela::OpenConnection(socketPath, deadline, connection);
  if (error != 0) {
    return error;
  }
  std::string line = vela::ToJsonText(request) + '\n';
  error = vela::SendAll(connection.Get(), line, deadline);
  if (error != 0) {
    return error;
  }
  line.clear();
  error = ReceiveLine(connection.Get(), deadline, line);
  if (error != 0) {
    return error;
  }
  connection.Reset();
  if (line.empty()) {
    return ECONNRESET;
  }
  return vela::ReadJsonObject(line, vela::DuplicateKeys::kLastWins, reply) ? 0 : EPROTO;
}

int ExchangeOrFail(const char* socketPath, Json::Value& packet, int timeoutSeconds) {
  try {
    const Deadline deadline{std::chrono::seconds(std::max(timeoutSeconds, 0))};
    Json::Value reply(Json::objectValue);
    const int error = Exchange(socketPath, packet, deadline, reply);
    if (error == 0) {
      packet = std::move(reply);
    }
    return error;
  } catch (const Json::Exception&) {
    return EINVAL;
  } catch (const std::exception&) {
    return ENOMEM;
  }
}

}  // namespace

int AutoSendRecvPacket(const char* socketPath, int /*unused*/, Json::Value& packet,
                       int timeoutSeconds) {
  const int error =
      socketPath == nullptr ? EINVAL : ExchangeOrFail(socketPath, packet, timeoutSeconds);
  if (error == 0) {
    return 0;
  }
  packet = Json::Value(Json::objectValue);
  return vela::Fail(error);
}
