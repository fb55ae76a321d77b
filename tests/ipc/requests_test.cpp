// What the client sends.
#include <gmock/gmock.h>

#include <climits>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "ipc/client_operations.h"
#include "ipc/json_text.h"
#include "support/daemon_peer.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class Requests : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
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

TEST_F(Requests, TheSocketIsTheDaemons) {
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

TEST_F(Requests, IndexVersionQueryCarriesThePath) {
  GetIndexVersion("/volume1/photo/a.jpg");
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/volume1/photo/a.jpg\"}\n");
}

TEST_F(Requests, VideoSwitchQueryCarriesTheCommandOnly) {
  IsDisableConvertVideo();
  EXPECT_EQ(NextRequest(), "{\"command\":\"IS_DISABLE_CONVERT_VIDEO\"}\n");
}

TEST_F(Requests, PhotoSwitchQueryCarriesTheCommandOnly) {
  IsDisableConvertPhoto();
  EXPECT_EQ(NextRequest(), "{\"command\":\"IS_DISABLE_CONVERT_PHOTO\"}\n");
}

TEST_F(Requests, PhotoReportCarriesThePath) {
  PostPhotoConvert("/volume1/photo/a.jpg");
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/volume1/photo/a.jpg\"}\n");
}

TEST_F(Requests, VideoReportCarriesThePath) {
  PostVideoConvert("/volume1/video/a.mp4");
  EXPECT_EQ(NextRequest(),
            "{\"command\":\"POST_VIDEO_CONVERT\",\"path\":\"/volume1/video/a.mp4\"}\n");
}

TEST_F(Requests, QuotesAndBackslashesAreEscaped) {
  PostPhotoConvert(R"(/tmp/a "quoted" back\slash.jpg)");
  EXPECT_EQ(NextRequest(),
            R"({"command":"POST_PHOTO_CONVERT","path":"/tmp/a \"quoted\" back\\slash.jpg"})"
            "\n");
}

TEST_F(Requests, BytesBeyondAsciiGoOutAsTheyAre) {
  const std::vector<std::string> names = {
      "gr\xC3\xBC\xC3\x9F"
      "e.jpg",                         // two-byte characters
      "\xE5\x86\x99\xE7\x9C\x9F.jpg",  // three-byte characters
      "\xF0\x9F\x93\xB7.jpg",          // beyond the basic plane
      "latin1-\xFC.jpg",               // not UTF-8
      "\x80\xFF\xC3.jpg",              // stray bytes and a cut character
      "\xC0\xAF.jpg",
      "\xED\xA0\x80.jpg",  // an overlong form, a lone surrogate
  };
  for (const std::string& name : names) {
    PostPhotoConvert(("/tmp/" + name).c_str());
    EXPECT_EQ(NextRequest(),
              "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/tmp/" + name + "\"}\n");
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

TEST_F(Requests, LongPathsAreNotCut) {
  const std::string path = "/tmp/" + std::string(9000, 'p') + ".jpg";
  PostPhotoConvert(path.c_str());
  EXPECT_EQ(NextRequest(), "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"" + path + "\"}\n");
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

TEST_F(Requests, EveryCallAsksAfreshOnAConnectionOfItsOwn) {
  Daemon().AnswerNext(DaemonReply::Line(R"({"success":true,"version":1})"));
  Daemon().AnswerNext(DaemonReply::Line(R"({"success":true,"version":2})"));
  EXPECT_EQ(GetIndexVersion("/tmp/a.jpg"), 1);
  EXPECT_EQ(GetIndexVersion("/tmp/a.jpg"), 2);
  EXPECT_EQ(Daemon().Connections(), 2U);
  EXPECT_THAT(Daemon().Commands(), ElementsAre("GET_INDEX_VERSION", "GET_INDEX_VERSION"));
}

TEST_F(Requests, AFailedCallIsNotTriedAgain) {
  size_t connections = 0;
  for (const ClientOperation& operation : ClientOperations()) {
    SCOPED_TRACE(operation.command);
    Daemon().AnswerNext(DaemonReply::CloseAfterRequest());
    EXPECT_EQ(operation.call("/tmp/a.jpg"), operation.failure);
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
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
