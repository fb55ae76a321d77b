// The daemon as its users start it, and clients of all manners.
#pragma once

#include <gtest/gtest.h>
#include <json/value.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "support/descriptor.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {

constexpr const char* kIndexDatabase = "/var/lib/velaindex/index.db";

/// Where the sandbox shows the program.
std::string IndexDaemonPath();

/// A running daemon.
class IndexDaemon {
 public:
  /// Starts it and waits until it takes connections; the test at hand fails when it does not.
  explicit IndexDaemon(std::vector<std::string> arguments = {},
                       const ProgramOptions& options = ProgramOptions());

  Program& Process() { return program_; }

  /// Sends the signal and waits for the end.
  ProgramResult End(int signal);

  /// How many descriptors it has open.
  size_t Descriptors() const;

  /// Waits until it has so many descriptors open; whether it came to that.
  bool WaitForDescriptors(size_t count) const;

  /// Waits until its log has this text; whether it came.
  bool WaitForLog(const std::string& text) const;

 private:
  Program program_;
};

/// Connects to the daemon's socket; not open when nobody listens there.
Descriptor ConnectToDaemon();

/// Sends all bytes, as far as the daemon takes them.
void SendBytes(const Descriptor& connection, const std::string& bytes);

/// Receives up to the end of the connection. `isEnded`, when given, tells whether it came within a
/// minute.
std::string ReceiveAll(const Descriptor& connection, bool* isEnded = nullptr);

/// Sends the line with a newline and receives up to the end of the connection.
std::string AskWithBytes(const std::string& line);

/// Reads a reply, which must be one line with a JSON object, newline included; the test at hand
/// fails when it is not that.
Json::Value ParseReply(const std::string& bytes);

/// Sends the request and reads the reply.
Json::Value Ask(const Json::Value& request);

/// A request with a path.
Json::Value PathRequest(const std::string& command, const std::string& path);

/// The media record of a path, null when the daemon has none to give.
Json::Value AskForMedia(const std::string& path, int type = 1);

/// The index version of a path, as the reply has it.
Json::Value AskForVersion(const std::string& path);

/// Sets, or with null removes, the version of a directory; whether the daemon did.
bool SetVersion(const std::string& path, const Json::Value& version);

/// The rows of a query on an index database, columns joined by "|"; the test at hand fails when
/// there is an error.
std::vector<std::string> Query(const std::string& sql,
                               const std::string& database = kIndexDatabase);

/// Fixture: every test has the sandbox in its first state.
class IndexDaemonTest : public SandboxTest {};

}  // namespace vela_test
