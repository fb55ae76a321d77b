// Invalid requests.
#include "index_daemon.h"
#include "request.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

using BadRequestTest = IndexDaemonTest;

/// Invalid requests, each with the error it gets.
std::vector<std::pair<std::string, std::string>> BadRequests() {
  const std::string notJson = "the request is not one JSON object";
  const std::string noVersion = "version is neither an integer from 0 to 2147483647 nor null";
  const auto version = [](const std::string& value) {
    return R"({"command":"SET_INDEX_VERSION","path":"/a","version":)" + value + "}";
  };
  const auto mediaType = [](const std::string& value) {
    return R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/a.jpg","type":)" + value + "}";
  };
  std::string deep(60000, '[');
  return {
      {"", notJson},
      {" ", notJson},
      {"GET_INDEX_VERSION /a", notJson},
      {"[]", notJson},
      {"\"GET_INDEX_VERSION\"", notJson},
      {"7", notJson},
      {"null", notJson},
      {"{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"", notJson},
      {"{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"} x", notJson},
      {"{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}{}", notJson},
      {"{'command':'GET_INDEX_VERSION','path':'/a'}", notJson},
      {R"({"command":"GET_INDEX_VERSION",/*x*/"path":"/a"})", notJson},
      {R"({"command":"GET_INDEX_VERSION","path":"/a"} // x)", notJson},
      {R"({"command":"GET_INDEX_VERSION","path":"/a",})", notJson},
      {R"({"command":"GET_INDEX_VERSION","path":"/a","path":"/b"})", notJson},
      {version("-"), notJson},
      {version("01"), notJson},
      {version("+1"), notJson},
      {version("1."), notJson},
      {version("1e"), notJson},
      {version("0x1"), notJson},
      {version("NaN"), notJson},
      {"\xef\xbb\xbf{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/a\"}", notJson},
      {deep, notJson},
      {"{\"command\":" + deep, notJson},
      {std::string("\0{}", 3), notJson},
      {"{}", "the member command is missing"},
      {R"({"path":"/a"})", "the member command is missing"},
      {R"({"command":null})", "command is not a string"},
      {R"({"command":1,"path":"/a"})", "command is not a string"},
      {R"({"command":["GET_INDEX_VERSION"],"path":"/a"})", "command is not a string"},
      {R"({"command":"","path":"/a"})", "the command is unknown"},
      {R"({"command":"get_index_version","path":"/a"})", "the command is unknown"},
      {R"({"command":"GET_INDEX_VERSION\u0000","path":"/a"})", "the command is unknown"},
      {R"({"command":"SHUTDOWN"})", "the command is unknown"},
      {R"({"command":"GET_INDEX_VERSION"})", "the member path is missing"},
      {R"({"command":"POST_PHOTO_CONVERT"})", "the member path is missing"},
      {R"({"command":"POST_VIDEO_CONVERT","path":7})", "path is not a string"},
      {R"({"command":"GET_INDEX_VERSION","path":null})", "path is not a string"},
      {R"({"command":"GET_INDEX_VERSION","path":["/a"]})", "path is not a string"},
      {R"({"command":"GET_INDEX_VERSION","path":""})", "path is empty"},
      {R"({"command":"GET_INDEX_VERSION","path":"a/b"})", "path does not begin with a slash"},
      {R"({"command":"GET_INDEX_VERSION","path":"/a\u0000b"})", "path contains a NUL byte"},
      {R"({"command":"GET_INDEX_VERSION","path":"/)" + std::string(4095, 'x') + "\"}",
       "path is longer than 4095 bytes"},
      {R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","type":1})", "the member path is missing"},
      {R"({"command":"GET_MEDIA_FROM_PLUGIN_DB","path":"/a.jpg"})", "the member type is missing"},
      {mediaType(R"("1")"), "type is not an integer"},
      {mediaType("1.0"), "type is not an integer"},
      {mediaType("true"), "type is not an integer"},
      {mediaType("99999999999"), "type is not an integer"},
      {R"({"command":"SET_INDEX_VERSION","path":"/a"})", "the member version is missing"},
      {version(R"("1")"), noVersion},
      {version("-1"), noVersion},
      {version("2147483648"), noVersion},
      {version("false"), noVersion},
      {R"({"command":"SET_INDEX_VERSION","version":1})", "the member path is missing"},
  };
}

TEST_F(BadRequestTest, GetsAnErrorAndDoesNoHarm) {
  IndexDaemon daemon;
  for (const auto& [line, error] : BadRequests()) {
    const Json::Value reply = ParseReply(QueryWithBytes(line));
    EXPECT_EQ(reply["success"], Json::Value(false)) << line.substr(0, 200);
    EXPECT_EQ(reply["error"], error) << line.substr(0, 200);
  }
  EXPECT_EQ(QueryVersion("/a"), 0);
  EXPECT_EQ(Query("SELECT count(*) FROM posted"), Rows{"0"});
  EXPECT_EQ(Query("SELECT count(*) FROM directory_index_version"), Rows{"0"});
  EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
}

TEST_F(BadRequestTest, LineMayHave64KibibytesAndNotOneMore) {
  const IndexDaemon daemon;
  std::string line = kVersionRequest;
  line.resize(kRequestMax, ' ');
  EXPECT_EQ(ParseReply(QueryWithBytes(line))["success"], Json::Value(true));
  line += ' ';
  const Json::Value reply = ParseReply(QueryWithBytes(line));
  EXPECT_EQ(reply["success"], Json::Value(false));
  EXPECT_EQ(reply["error"], "the request is longer than 65536 bytes");
}

TEST_F(BadRequestTest, EndlessLineIsAnsweredAndClosed) {
  const IndexDaemon daemon;
  const Descriptor connection = ConnectToDaemon();
  SendBytes(connection, std::string(4 * 1024 * 1024, 'x'));
  shutdown(connection.Get(), SHUT_WR);
  bool isEnded = false;
  const Json::Value reply = ParseReply(ReceiveAll(connection, &isEnded));
  EXPECT_TRUE(isEnded);
  EXPECT_EQ(reply["error"], "the request is longer than 65536 bytes");
}

TEST_F(BadRequestTest, LongestPathIsAccepted) {
  const IndexDaemon daemon;
  const std::string path = "/" + std::string(4094, '"');
  EXPECT_EQ(QueryVersion(path), 0);
  std::string deep;
  for (int i = 0; i < 2047; ++i) deep += "/a";
  EXPECT_TRUE(SetVersion("/a", 3));
  EXPECT_EQ(QueryVersion(deep), 3);
}

TEST_F(BadRequestTest, UnknownMembersAreIgnored) {
  const IndexDaemon daemon;
  const Json::Value reply = ParseReply(QueryWithBytes(
      R"({"x":{"command":1},"path":"/a","command":"GET_INDEX_VERSION","type":"?"})"));
  EXPECT_EQ(reply["success"], Json::Value(true));
}

TEST_F(BadRequestTest, NumbersOfAllFormsAndSlashesInStringsAreJson) {
  const IndexDaemon daemon;
  for (const char* value : {"0", "-0", "10", "-1.5", "1e5", "1E+05", "0.0e-1", R"("// \\" )",
                            R"("\"/-")", R"("\\")", "[1,-2]", "{}", "null"}) {
    const std::string line =
        std::string(R"({"command":"GET_INDEX_VERSION","path":"/a//-01","x":)") + value + "}";
    EXPECT_EQ(ParseReply(QueryWithBytes(line))["success"], Json::Value(true)) << line;
  }
}

TEST_F(BadRequestTest, OnlyTheFirstLineCounts) {
  const IndexDaemon daemon;
  const std::string request = kVersionRequest;
  EXPECT_EQ(ParseReply(QueryWithBytes(request + "\n" + request))["version"], 0);
}

TEST_F(BadRequestTest, IsLoggedWithItsReasonAtALimitedRate) {
  IndexDaemon daemon;
  constexpr int kRequests = 300;
  for (int i = 0; i < kRequests; ++i) QueryWithBytes("x");
  const std::string log = daemon.End(SIGTERM).err;
  size_t lines = 0;
  for (size_t at = log.find("outcome=refused"); at != std::string::npos;
       at = log.find("outcome=refused", at + 1)) {
    ++lines;
  }
  EXPECT_GE(lines, 1U);
  EXPECT_LT(lines, kRequests / 2U);
  EXPECT_THAT(log, HasSubstr("level=warning event=request outcome=refused "
                             "error=\"the request is not one JSON object\" pid="));
}

}  // namespace
}  // namespace vela_test
