// The requests that the client sends.
#include <climits>
#include <optional>
#include <thread>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::SizeIs;

class Requests : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    daemon_.emplace();
  }

  DaemonPeer& Daemon() { return *daemon_; }

  /// The bytes of the only request since the last call.
  std::string NextRequest() {
    const std::vector<DaemonRequest> requests = Daemon().Requests();
    const size_t expected = ++seen_;
    EXPECT_EQ(requests.size(), expected);
    return requests.empty() ? std::string() : requests.back().bytes;
  }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
  size_t seen_ = 0;
};

TEST_F(Requests, GoToTheSocketOfTheDaemon) {
  EXPECT_STREQ(PluginDaemonSocketPath, "/tmp/velaindexplugind_sock");
}

TEST_F(Requests, MediaQueryCarriesPathAndNumericType) {
  for (const int type : {1, 2, 0, -7, INT_MAX, INT_MIN}) {
    VELA_MEDIA_INFO media = {};
    GetMediaFromPluginDB(type, "/volume1/photo/a.jpg", media);
    EXPECT_EQ(NextRequest(),
              "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/volume1/photo/a.jpg\","
              "\"type\":" +
                  std::to_string(type) + "}\n");
  }
}

TEST_F(Requests, OtherRequestsCarryThePathOrTheCommandOnly) {
  GetIndexVersion(kPath);
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/volume1/photo/a.jpg\"}\n");
  IsDisableConvertVideo();
  EXPECT_EQ(NextRequest(), "{\"command\":\"IS_DISABLE_CONVERT_VIDEO\"}\n");
  IsDisableConvertPhoto();
  EXPECT_EQ(NextRequest(), "{\"command\":\"IS_DISABLE_CONVERT_PHOTO\"}\n");
  PostPhotoConvert(kPath);
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/volume1/photo/a.jpg\"}\n");
  PostVideoConvert("/volume1/video/a.mp4");
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"POST_VIDEO_CONVERT\",\"path\":\"/volume1/video/a.mp4\"}\n");
}

TEST_F(Requests, PathsInJson) {
  const struct {
    std::string path;
    std::string json;
  } cases[] = {
      {R"(/tmp/a "quoted" back\slash.jpg)", R"(/tmp/a \"quoted\" back\\slash.jpg)"},
      {"/tmp/gr\xC3\xBC\xC3\x9F.jpg", "/tmp/gr\xC3\xBC\xC3\x9F.jpg"},  // two-byte characters
      {"/tmp/\xE5\x86\x99\xE7\x9C\x9F.jpg", "/tmp/\xE5\x86\x99\xE7\x9C\x9F.jpg"},  // three bytes
      {"/tmp/\xF0\x9F\x93\xB7.jpg", "/tmp/\xF0\x9F\x93\xB7.jpg"},  // beyond the basic plane
      {"/tmp/latin1-\xFC.jpg", "/tmp/latin1-\xFC.jpg"},            // not UTF-8
      {"/tmp/\x80\xFF\xC3.jpg", "/tmp/\x80\xFF\xC3.jpg"},  // stray bytes and a cut character
      {"/tmp/\xC0\xAF.jpg", "/tmp/\xC0\xAF.jpg"},          // an overlong form
      {"/tmp/\xED\xA0\x80.jpg", "/tmp/\xED\xA0\x80.jpg"},  // a lone surrogate
      {"/tmp/" + std::string(9000, 'p'), "/tmp/" + std::string(9000, 'p')},
  };
  for (const auto& c : cases) {
    PostPhotoConvert(c.path.c_str());
    EXPECT_EQ(NextRequest(), "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"" + c.json + "\"}\n");
  }
}

TEST_F(Requests, EveryByteOfAPathArrives) {
  std::string path = "/tmp/";
  for (int byte = 1; byte < 256; ++byte) {
    path += static_cast<char>(byte);
  }
  for (const ClientOperation& operation : ClientOperations()) {
    SCOPED_TRACE(operation.command);
    operation.call(path.c_str());
    const std::string request = NextRequest();
    // A newline inside would end the request for its reader.
    EXPECT_EQ(request.find('\n'), request.size() - 1);
    EXPECT_EQ(Parsed(request).isMember("path"), operation.sendsPath);
    EXPECT_EQ(Parsed(request)["path"].asString(), operation.sendsPath ? path : "");
  }
}

TEST_F(Requests, OnlyTheMediaQueryCarriesAType) {
  for (const ClientOperation& operation : ClientOperations()) {
    SCOPED_TRACE(operation.command);
    operation.call("/tmp/a.jpg");
    const Json::Value request = Parsed(NextRequest());
    EXPECT_EQ(request["command"].asString(), operation.command);
    EXPECT_EQ(request.isMember("type"), operation.command == "GET_MEDIA_FROM_PLUGIN_DB");
  }
}

TEST_F(Requests, EveryCallUsesItsOwnConnection) {
  Daemon().AnswerNext(DaemonReply::Line(R"({"success":true,"version":1})"));
  Daemon().AnswerNext(DaemonReply::Line(R"({"success":true,"version":2})"));
  EXPECT_EQ(GetIndexVersion("/tmp/a.jpg"), 1);
  EXPECT_EQ(GetIndexVersion("/tmp/a.jpg"), 2);
  EXPECT_EQ(Daemon().Connections(), 2U);
  EXPECT_THAT(Daemon().Commands(), ElementsAre("GET_INDEX_VERSION", "GET_INDEX_VERSION"));
}

TEST_F(Requests, AFailedCallIsNotRetried) {
  size_t connections = 0;
  for (const ClientOperation& operation : ClientOperations()) {
    SCOPED_TRACE(operation.command);
    Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
    ExpectFailure(operation);
    EXPECT_EQ(Daemon().Connections(), ++connections);
  }
}

TEST_F(Requests, CallsFromSeveralThreadsDoNotMix) {
  constexpr int kCalls = 25;
  Daemon().SetIndexVersion(4);
  std::vector<int> versions(kCalls);
  std::thread other([] {
    for (int i = 0; i < kCalls; ++i) {
      PostPhotoConvert("/tmp/b.jpg");
    }
  });
  for (int& version : versions) {
    version = GetIndexVersion("/tmp/a.jpg");
  }
  other.join();
  EXPECT_THAT(versions, ::testing::Each(4));
  EXPECT_THAT(Daemon().Requests(), SizeIs(2 * kCalls));
}

}  // namespace
}  // namespace vela_test
