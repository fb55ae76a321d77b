// The daemon as its users start it, its clients, and its index.
#pragma once

#include <gmock/gmock.h>
#include <json/value.h>
#include <sqlite3.h>
#include <sys/socket.h>

#include <csignal>
#include <cstdint>
#include <string>
#include <vector>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "support/descriptor.h"
#include "support/files.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {

using Rows = std::vector<std::string>;

constexpr const char* kIndexDatabase = "/var/lib/velaindex/index.db";

/// Requests without their newline.
constexpr const char* kVersionRequest = R"({"command":"GET_INDEX_VERSION","path":"/a"})";
constexpr const char* kPostRequest = R"({"command":"POST_PHOTO_CONVERT","path":"/a.jpg"})";

/// Where the sandbox shows the program.
std::string IndexDaemonPath();

/// Runs the program to its end.
ProgramResult RunDaemon(const std::vector<std::string>& arguments);

/// How the daemon ends when it cannot start.
enum class NoStart {
  kPassing = 1,    ///< systemd starts it again
  kPermanent = 78  ///< systemd leaves it to an administrator
};

/// Fails the test unless the daemon refuses to start with these arguments, with this status and a
/// log that has the text. Returns the log.
std::string ExpectRefusal(const std::vector<std::string>& arguments, const std::string& text,
                          NoStart status);

/// A running daemon.
class IndexDaemon {
 public:
  /// Starts it and waits until it accepts connections; fails the test when it does not.
  explicit IndexDaemon(std::vector<std::string> arguments = {},
                       const ProgramOptions& options = ProgramOptions());

  Program& Process() { return program_; }

  /// Sends the signal and waits for the end.
  ProgramResult End(int signal);

  /// The number of its open descriptors.
  size_t Descriptors() const;

  /// Waits until it has `count` open descriptors; returns whether it has.
  bool WaitForDescriptors(size_t count) const;

  /// Waits until it has at most `count` open descriptors; returns whether it has.
  bool WaitForAtMostDescriptors(size_t count) const;

  /// Waits until its log has this text; returns whether it has.
  bool WaitForLog(const std::string& text) const;

 private:
  Program program_;
};

/// A Unix socket of this type (SOCK_STREAM, SOCK_DGRAM) that is bound or connected to the path;
/// `use` is bind or connect. Not open when that fails, with errno set.
Descriptor SocketAt(const char* path, int type, int (*use)(int, const sockaddr*, socklen_t));

/// Connects to the daemon's socket; not open when nothing listens there.
Descriptor ConnectToDaemon();

/// Waits until the daemon, started otherwise than as an IndexDaemon, accepts connections.
void WaitForDaemon();

/// Connects and sends the line with a newline.
Descriptor SendLine(const std::string& line);

/// Sends all bytes, as far as the daemon accepts them.
void SendBytes(const Descriptor& connection, const std::string& bytes);

/// Receives up to the end of the connection. Sets `isEnded`, when given, to whether the end came
/// within a minute.
std::string ReceiveAll(const Descriptor& connection, bool* isEnded = nullptr);

/// Sends the line with a newline and receives up to the end of the connection.
std::string QueryWithBytes(const std::string& line);

/// Reads a reply, which must be one line with a JSON object, newline included; fails the test
/// otherwise.
Json::Value ParseReply(const std::string& bytes);

/// Receives and reads the reply.
Json::Value ReceiveReply(const Descriptor& connection);

/// Fails the test unless the reply reports success.
void ExpectSuccess(const Descriptor& connection);

/// Sends the request and reads the reply.
Json::Value Ask(const Json::Value& request);

/// A request with a path.
Json::Value PathRequest(const std::string& command, const std::string& path);

/// The media record of a path, null when the daemon has none.
Json::Value AskForMedia(const std::string& path, int type = 1);

/// The index version of a path, as the reply has it.
Json::Value QueryVersion(const std::string& path);

/// Sets the version of a directory, or removes it with null; returns whether the daemon reports
/// success.
bool SetVersion(const std::string& path, const Json::Value& version);

/// The rows of a query on an index database, columns joined by "|"; fails the test on an error.
Rows Query(const std::string& sql, const std::string& database = kIndexDatabase);

/// Locks the index as another program that writes to it.
class IndexHolder {
 public:
  IndexHolder();
  ~IndexHolder() { Release(); }
  IndexHolder(const IndexHolder&) = delete;
  IndexHolder& operator=(const IndexHolder&) = delete;

  void Release();

 private:
  sqlite3* database_ = nullptr;
};

/// Every test starts with a reset sandbox.
class IndexDaemonTest : public SandboxTest {};

}  // namespace vela_test
