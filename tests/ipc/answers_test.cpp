// What the client makes of the daemon's answers.
#include <gmock/gmock.h>

#include <cstdint>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPath = "/volume1/photo/a.jpg";

class Answers : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    daemon_.emplace();
  }

  void AnswerNext(const std::string& line) { daemon_->AnswerNext(DaemonReply::Line(line)); }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

/// A record with no byte at zero, to see which of them a call writes.
VELA_MEDIA_INFO ScribbledRecord() {
  VELA_MEDIA_INFO record;
  std::memset(&record, 0xA5, sizeof record);
  return record;
}

bool IsScribbled(const VELA_MEDIA_INFO& record) {
  const VELA_MEDIA_INFO scribbled = ScribbledRecord();
  return std::memcmp(&record, &scribbled, sizeof record) == 0;
}

void ExpectCleared(const VELA_MEDIA_INFO& record) {
  EXPECT_STREQ(record.path, "");
  EXPECT_EQ(record.type, 0);
  EXPECT_EQ(record.width, 0U);
  EXPECT_EQ(record.height, 0U);
  EXPECT_EQ(record.rotation, 0);
  EXPECT_EQ(record.duration, 0);
  EXPECT_EQ(record.bitrate, 0U);
  EXPECT_EQ(record.size, 0);
  EXPECT_EQ(record.mtime, 0);
}

TEST_F(Answers, WhatCountsAsSuccess) {
  for (const char* success : {"true", "1", "-1", "0.5", "1e300"}) {
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(operation.command + " " + success);
      AnswerNext(std::string("{\"success\":") + success + "}");
      EXPECT_EQ(operation.call(kPath), 0);
    }
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, WhatCountsAsFailure) {
  const std::vector<std::string> replies = {
      R"({"success":false})",
      R"({})",
      R"({"success":null})",
      R"({"success":0})",
      R"({"success":0.0})",
      R"({"success":"true"})",
      R"({"success":"1"})",
      R"({"success":""})",
      R"({"success":[]})",
      R"({"success":[true]})",
      R"({"success":{}})",
      R"({"success":{"success":true}})",
      R"({"Success":true})",
      R"({"error":{"success":true}})",
      R"({"version":3,"result":true,"media":{"width":1}})",
  };
  for (const std::string& reply : replies) {
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(operation.command + " " + reply);
      ClearLog();
      AnswerNext(reply);
      EXPECT_EQ(operation.call(kPath), operation.failure);
      EXPECT_THAT(ErrorLines(), ElementsAre(operation.failLine));
    }
  }
}

TEST_F(Answers, AFailureHidesTheAnswerBesideIt) {
  AnswerNext(R"({"success":false,"version":3})");
  EXPECT_EQ(GetIndexVersion(kPath), -1);
  AnswerNext(R"({"success":false,"result":true})");
  EXPECT_FALSE(IsDisableConvertVideo());
  AnswerNext(R"({"success":false,"result":true})");
  EXPECT_FALSE(IsDisableConvertPhoto());
  VELA_MEDIA_INFO media = ScribbledRecord();
  AnswerNext(R"({"success":false,"media":{"width":3,"height":4}})");
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), -1);
  EXPECT_TRUE(IsScribbled(media));
}

TEST_F(Answers, Versions) {
  const struct {
    const char* reply;
    int version;
  } cases[] = {
      {R"({"success":true,"version":3})", 3},
      {R"({"success":true,"version":0})", 0},
      {R"({"success":true,"version":-3})", -3},
      {R"({"success":true,"version":2147483647})", 2147483647},
      {R"({"success":true,"version":-2147483648})", INT32_MIN},
      {R"({"success":true,"version":3.9})", 3},
      {R"({"success":true,"version":-3.9})", -3},
      {R"({"success":true,"version":true})", 1},
      {R"({"success":true,"version":null})", 0},
      {R"({"success":true})", 0},
      // What is no number of this size says nothing about the version.
      {R"({"success":true,"version":"3"})", 0},
      {R"({"success":true,"version":[3]})", 0},
      {R"({"success":true,"version":{"version":3}})", 0},
      {R"({"success":true,"version":2147483648})", 0},
      {R"({"success":true,"version":1099511627776})", 0},
      {R"({"success":true,"version":18446744073709551615})", 0},
      {R"({"success":true,"version":1e30})", 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.reply);
    AnswerNext(c.reply);
    EXPECT_EQ(GetIndexVersion(kPath), c.version);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, Switches) {
  const struct {
    const char* reply;
    bool isDisabled;
  } cases[] = {
      {R"({"success":true,"result":true})", true},
      {R"({"success":true,"result":false})", false},
      {R"({"success":true})", false},
      {R"({"success":true,"result":null})", false},
      {R"({"success":true,"result":1})", true},
      {R"({"success":true,"result":0})", false},
      {R"({"success":true,"result":0.25})", true},
      {R"({"success":true,"result":"true"})", false},
      {R"({"success":true,"result":[true]})", false},
      {R"({"success":true,"result":{"result":true}})", false},
      {R"({"success":true,"version":1})", false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.reply);
    AnswerNext(c.reply);
    EXPECT_EQ(IsDisableConvertVideo(), c.isDisabled);
    AnswerNext(c.reply);
    EXPECT_EQ(IsDisableConvertPhoto(), c.isDisabled);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, MembersThatNobodyAskedForChangeNothing) {
  AnswerNext(
      R"({"api":7,"list":[1,{"a":null}],"success":true,"text":"\u00e9\n","version":5,"z":{}})");
  EXPECT_EQ(GetIndexVersion(kPath), 5);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, MediaRecordIsFilled) {
  AnswerNext(R"({"success":true,"media":{"path":"/volume1/video/a.mp4","type":2,"width":1080,)"
             R"("height":1920,"rotation":90,"duration":61,"bitrate":3000000000,"size":5000000000,)"
             R"("mtime":1700000000,"codec":"none of ours"}})");
  VELA_MEDIA_INFO media = ScribbledRecord();
  EXPECT_EQ(GetMediaFromPluginDB(2, "/volume1/video/a.mp4", media), 0);
  EXPECT_STREQ(media.path, "/volume1/video/a.mp4");
  EXPECT_EQ(media.type, 2);
  EXPECT_EQ(media.width, 1080U);
  EXPECT_EQ(media.height, 1920U);
  EXPECT_EQ(media.rotation, 90);
  EXPECT_EQ(media.duration, 61);
  EXPECT_EQ(media.bitrate, 3000000000U);
  EXPECT_EQ(media.size, 5000000000);
  EXPECT_EQ(media.mtime, 1700000000);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, AMissingMediaObjectReadsAsAnEmptyOne) {
  const std::vector<std::string> replies = {
      R"({"success":true})",
      R"({"success":true,"media":{}})",
      R"({"success":true,"media":null})",
      R"({"success":true,"media":"{\"width\":3}"})",
      R"({"success":true,"media":7})",
      R"({"success":true,"media":true})",
      R"({"success":true,"media":[{"width":3}]})",
      R"({"success":true,"width":3,"height":4})",
  };
  for (const std::string& reply : replies) {
    SCOPED_TRACE(reply);
    VELA_MEDIA_INFO media = ScribbledRecord();
    AnswerNext(reply);
    EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
    ExpectCleared(media);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Answers, MediaMembersOfAnotherTypeReadAsNothing) {
  AnswerNext(R"({"success":true,"media":{"path":7,"type":"1","width":"640","height":[480],)"
             R"("rotation":{},"duration":null,"bitrate":"x","size":[],"mtime":{"s":1}}})");
  VELA_MEDIA_INFO media = ScribbledRecord();
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  ExpectCleared(media);
}

TEST_F(Answers, MediaMembersOutOfRangeReadAsNothingAndTheOthersStay) {
  AnswerNext(R"({"success":true,"media":{"path":"/a","type":4294967297,"width":4294967296,)"
             R"("height":-1,"rotation":2147483648,"duration":1e30,"bitrate":-5,)"
             R"("size":18446744073709551615,"mtime":12}})");
  VELA_MEDIA_INFO media = ScribbledRecord();
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  EXPECT_STREQ(media.path, "/a");
  EXPECT_EQ(media.type, 0);
  EXPECT_EQ(media.width, 0U);
  EXPECT_EQ(media.height, 0U);
  EXPECT_EQ(media.rotation, 0);
  EXPECT_EQ(media.duration, 0);
  EXPECT_EQ(media.bitrate, 0U);
  EXPECT_EQ(media.size, 0);
  EXPECT_EQ(media.mtime, 12);
}

TEST_F(Answers, TheLargestMediaMembersStay) {
  AnswerNext(
      R"({"success":true,"media":{"width":4294967295,"height":4294967295,"bitrate":4294967295,)"
      R"("rotation":-2147483648,"duration":2147483647,"size":9223372036854775807,)"
      R"("mtime":-9223372036854775808}})");
  VELA_MEDIA_INFO media = ScribbledRecord();
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  EXPECT_EQ(media.width, UINT32_MAX);
  EXPECT_EQ(media.height, UINT32_MAX);
  EXPECT_EQ(media.bitrate, UINT32_MAX);
  EXPECT_EQ(media.rotation, INT32_MIN);
  EXPECT_EQ(media.duration, INT32_MAX);
  EXPECT_EQ(media.size, INT64_MAX);
  EXPECT_EQ(media.mtime, INT64_MIN);
}

TEST_F(Answers, PathsInAMediaRecordKeepTheirBytes) {
  AnswerNext("{\"success\":true,\"media\":{\"path\":\"/a \\\"b\\\\ \xC3\xA9 \xFC.jpg\"}}");
  VELA_MEDIA_INFO media = ScribbledRecord();
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), 0);
  EXPECT_STREQ(media.path, "/a \"b\\ \xC3\xA9 \xFC.jpg");
}

}  // namespace
}  // namespace vela_test
