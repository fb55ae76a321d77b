#include "index_daemon.h"

#include <json/reader.h>
#include <json/writer.h>
#include <poll.h>
#include <sys/un.h>

#include <array>
#include <chrono>
#include <cstring>
#include <functional>
#include <memory>
#include <thread>
#include <utility>

namespace vela_test {

namespace {

constexpr int kReceiveMilliseconds = 60000;

/// Waits up to a minute, which is enough on a busy machine.
bool WaitUntil(const std::function<bool()>& condition) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
  while (!condition()) {
    if (std::chrono::steady_clock::now() > end) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return true;
}

}  // namespace

std::string IndexDaemonPath() {
  return BuiltPath(VELAINDEXPLUGIND_FILE);
}

ProgramResult RunDaemon(const std::vector<std::string>& arguments) {
  return RunProgram(IndexDaemonPath(), arguments);
}

std::string ExpectRefusal(const std::vector<std::string>& arguments, const std::string& text,
                          NoStart status) {
  const ProgramResult result = RunDaemon(arguments);
  EXPECT_EQ(result.exitCode, static_cast<int>(status));
  EXPECT_THAT(result.err, testing::HasSubstr(text));
  return result.err;
}

IndexDaemon::IndexDaemon(std::vector<std::string> arguments, const ProgramOptions& options)
    : program_(StartProgram(IndexDaemonPath(), arguments, options)) {
  // A connection would be among those that the test counts.
  EXPECT_TRUE(WaitForLog("event=settings")) << program_.Error();
}

ProgramResult IndexDaemon::End(int signal) {
  program_.Kill(signal);
  return program_.Wait().value_or(ProgramResult());
}

size_t IndexDaemon::Descriptors() const {
  return ListDirectory("/proc/" + std::to_string(program_.Pid()) + "/fd").size();
}

bool IndexDaemon::WaitForDescriptors(size_t count) const {
  return WaitUntil([&] { return Descriptors() == count; });
}

bool IndexDaemon::WaitForAtMostDescriptors(size_t count) const {
  return WaitUntil([&] { return Descriptors() <= count; });
}

bool IndexDaemon::WaitForLog(const std::string& text) const {
  return WaitUntil([&] { return program_.Error().find(text) != std::string::npos; });
}

Descriptor SocketAt(const char* path, int type, int (*use)(int, const sockaddr*, socklen_t)) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path, sizeof address.sun_path - 1);
  Descriptor made(socket(AF_UNIX, type | SOCK_CLOEXEC, 0));
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  if (use(made.Get(), generic, sizeof address) != 0) return Descriptor();
  return made;
}

Descriptor ConnectToDaemon() {
  return SocketAt(PluginDaemonSocketPath, SOCK_STREAM, connect);
}

void WaitForDaemon() {
  EXPECT_TRUE(WaitUntil([] { return ConnectToDaemon().IsOpen(); }));
}

Descriptor SendLine(const std::string& line) {
  Descriptor connection = ConnectToDaemon();
  EXPECT_TRUE(connection.IsOpen());
  SendBytes(connection, line + "\n");
  return connection;
}

void SendBytes(const Descriptor& connection, const std::string& bytes) {
  size_t sent = 0;
  while (sent < bytes.size()) {
    const ssize_t count =
        send(connection.Get(), bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
    if (count < 0) return;
    sent += static_cast<size_t>(count);
  }
}

std::string ReceiveAll(const Descriptor& connection, bool* isEnded) {
  std::string bytes;
  std::array<char, 4096> chunk;
  ssize_t got = 1;
  while (got > 0) {
    pollfd waiting = {connection.Get(), POLLIN, 0};
    if (poll(&waiting, 1, kReceiveMilliseconds) != 1) break;
    got = recv(connection.Get(), chunk.data(), chunk.size(), 0);
    if (got > 0) bytes.append(chunk.data(), static_cast<size_t>(got));
  }
  if (isEnded != nullptr) *isEnded = got <= 0;
  return bytes;
}

std::string QueryWithBytes(const std::string& line) {
  const Descriptor connection = SendLine(line);
  bool isEnded = false;
  const std::string reply = ReceiveAll(connection, &isEnded);
  EXPECT_TRUE(isEnded) << "the daemon does not close the connection";
  return reply;
}

Json::Value ParseReply(const std::string& bytes) {
  Json::Value reply;
  const size_t newline = bytes.find('\n');
  EXPECT_EQ(newline + 1, bytes.size()) << "not one line: " << bytes;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  std::string errors;
  EXPECT_TRUE(reader->parse(bytes.data(), bytes.data() + bytes.size(), &reply, &errors))
      << bytes << errors;
  if (!reply.isObject()) {
    ADD_FAILURE() << "no object: " << bytes;
    reply = Json::Value(Json::objectValue);
  }
  return reply;
}

Json::Value ReceiveReply(const Descriptor& connection) {
  return ParseReply(ReceiveAll(connection));
}

void ExpectSuccess(const Descriptor& connection) {
  EXPECT_EQ(ReceiveReply(connection)["success"], Json::Value(true));
}

Json::Value Ask(const Json::Value& request) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  return ParseReply(QueryWithBytes(Json::writeString(builder, request)));
}

Json::Value PathRequest(const std::string& command, const std::string& path) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["path"] = path;
  return request;
}

Json::Value AskForMedia(const std::string& path, int type) {
  Json::Value request = PathRequest("GET_MEDIA_FROM_PLUGIN_DB", path);
  request["type"] = type;
  const Json::Value reply = Ask(request);
  return reply["success"] == Json::Value(true) ? reply["media"] : Json::Value();
}

Json::Value QueryVersion(const std::string& path) {
  return Ask(PathRequest("GET_INDEX_VERSION", path))["version"];
}

bool SetVersion(const std::string& path, const Json::Value& version) {
  Json::Value request = PathRequest("SET_INDEX_VERSION", path);
  request["version"] = version;
  return Ask(request)["success"] == Json::Value(true);
}

Rows Query(const std::string& sql, const std::string& database) {
  sqlite3* opened = nullptr;
  EXPECT_EQ(sqlite3_open_v2(database.c_str(), &opened, SQLITE_OPEN_READWRITE, nullptr), SQLITE_OK);
  const std::unique_ptr<sqlite3, int (*)(sqlite3*)> owner(opened, sqlite3_close);
  sqlite3_busy_timeout(opened, 10000);
  Rows rows;
  const auto takeRow = [](void* result, int count, char** values, char** /*names*/) {
    std::string row;
    for (int i = 0; i < count; ++i) {
      if (i > 0) row += '|';
      row += values[i] == nullptr ? "NULL" : values[i];
    }
    static_cast<Rows*>(result)->push_back(row);
    return 0;
  };
  EXPECT_EQ(sqlite3_exec(opened, sql.c_str(), takeRow, &rows, nullptr), SQLITE_OK)
      << sqlite3_errmsg(opened) << ": " << sql;
  return rows;
}

IndexHolder::IndexHolder() {
  EXPECT_EQ(sqlite3_open(kIndexDatabase, &database_), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(database_, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
}

void IndexHolder::Release() {
  EXPECT_EQ(sqlite3_close(database_), SQLITE_OK);
  database_ = nullptr;
}

}  // namespace vela_test
