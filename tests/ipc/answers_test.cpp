// How the client interprets the daemon's answers.
#include <cstdint>
#include <cstring>
#include <optional>
#include <sstream>

#include "ipc/client_operations.h"
#include "support/daemon_peer.h"

namespace vela_test {
namespace {

class Answers : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    daemon_.emplace();
  }

  void AnswerNext(const std::string& line) { daemon_->AnswerNext(DaemonReply::Line(line)); }

  /// The record that the client reads from this media object in a successful reply.
  VELA_MEDIA_INFO Record(const std::string& media) {
    return RecordOfAnswer(R"({"success":true,"media":)" + media + "}");
  }

  VELA_MEDIA_INFO RecordOfAnswer(const std::string& answer) {
    // No byte is zero, to detect which of them the call writes.
    VELA_MEDIA_INFO record;
    std::memset(&record, 0xA5, sizeof record);
    AnswerNext(answer);
    EXPECT_EQ(GetMediaFromPluginDB(1, kPath, record), 0);
    return record;
  }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

std::string Described(const VELA_MEDIA_INFO& record) {
  std::ostringstream text;
  text << "path " << record.path << ", type " << record.type << ", " << record.width << "x"
       << record.height << ", rotation " << record.rotation << ", duration " << record.duration
       << ", bitrate " << record.bitrate << ", size " << record.size << ", mtime " << record.mtime;
  return text.str();
}

constexpr const char* kClearedRecord =
    "path , type 0, 0x0, rotation 0, duration 0, bitrate 0, size 0, mtime 0";

TEST_F(Answers, Successes) {
  for (const char* success : {"true", "1", "-1", "0.5", "1e300"}) {
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(operation.command + " " + success);
      AnswerNext(std::string("{\"success\":") + success + "}");
      EXPECT_EQ(operation.call(kPath), 0);
    }
  }
}

TEST_F(Answers, Failures) {
  for (const char* answer : {
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
       }) {
    for (const ClientOperation& operation : ClientOperations()) {
      SCOPED_TRACE(answer);
      AnswerNext(answer);
      ExpectFailure(operation);
    }
  }
}

TEST_F(Answers, AFailureHidesTheOtherMembers) {
  VELA_MEDIA_INFO media;
  std::memset(&media, 0xA5, sizeof media);
  const VELA_MEDIA_INFO before = media;
  AnswerNext(R"({"success":false,"media":{"width":3,"height":4}})");
  EXPECT_EQ(GetMediaFromPluginDB(1, kPath, media), -1);
  EXPECT_EQ(std::memcmp(&media, &before, sizeof media), 0);
  AnswerNext(R"({"success":false,"version":3})");
  EXPECT_EQ(GetIndexVersion(kPath), -1);
  AnswerNext(R"({"success":false,"result":true})");
  EXPECT_FALSE(IsDisableConvertVideo());
  AnswerNext(R"({"success":false,"result":true})");
  EXPECT_FALSE(IsDisableConvertPhoto());
  EXPECT_THAT(TakeErrorLines(),
              ::testing::ElementsAre("velamk_ipc:30 fail", "velamk_ipc:57 fail",
                                     "velamk_ipc:83 fail", "velamk_ipc:110 fail"));
}

TEST_F(Answers, Versions) {
  const struct {
    const char* answer;
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
      // Values of other types and numbers out of range count as no version.
      {R"({"success":true,"version":"3"})", 0},
      {R"({"success":true,"version":[3]})", 0},
      {R"({"success":true,"version":{"version":3}})", 0},
      {R"({"success":true,"version":2147483648})", 0},
      {R"({"success":true,"version":1099511627776})", 0},
      {R"({"success":true,"version":18446744073709551615})", 0},
      {R"({"success":true,"version":1e30})", 0},
      // Unknown members are ignored.
      {R"({"api":7,"list":[1,{"a":null}],"success":true,"text":"\u00e9\n","version":5,"z":{}})", 5},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.answer);
    AnswerNext(c.answer);
    EXPECT_EQ(GetIndexVersion(kPath), c.version);
  }
}

TEST_F(Answers, Switches) {
  const struct {
    const char* answer;
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
    SCOPED_TRACE(c.answer);
    AnswerNext(c.answer);
    EXPECT_EQ(IsDisableConvertVideo(), c.isDisabled);
    AnswerNext(c.answer);
    EXPECT_EQ(IsDisableConvertPhoto(), c.isDisabled);
  }
}

TEST_F(Answers, AMissingMediaObjectReadsAsAnEmptyOne) {
  for (const char* answer : {
           R"({"success":true})",
           R"({"success":true,"media":{}})",
           R"({"success":true,"media":null})",
           R"({"success":true,"media":"{\"width\":3}"})",
           R"({"success":true,"media":7})",
           R"({"success":true,"media":true})",
           R"({"success":true,"media":[{"width":3}]})",
           R"({"success":true,"width":3,"height":4})",
       }) {
    EXPECT_EQ(Described(RecordOfAnswer(answer)), kClearedRecord) << answer;
  }
}

TEST_F(Answers, MediaRecords) {
  const struct {
    const char* media;
    const char* record;
  } cases[] = {
      {R"({"path":"/volume1/video/a.mp4","type":2,"width":1080,"height":1920,"rotation":90,)"
       R"("duration":61,"bitrate":3000000000,"size":5000000000,"mtime":1700000000,"codec":"x"})",
       "path /volume1/video/a.mp4, type 2, 1080x1920, rotation 90, duration 61, "
       "bitrate 3000000000, size 5000000000, mtime 1700000000"},
      // Members of another type read as zero, and so do numbers out of range.
      {R"({"path":7,"type":"1","width":"640","height":[480],"rotation":{},"duration":null,)"
       R"("bitrate":"x","size":[],"mtime":{"s":1}})",
       kClearedRecord},
      {R"({"path":"/a","type":4294967297,"width":4294967296,"height":-1,"rotation":2147483648,)"
       R"("duration":1e30,"bitrate":-5,"size":18446744073709551615,"mtime":12})",
       "path /a, type 0, 0x0, rotation 0, duration 0, bitrate 0, size 0, mtime 12"},
      {R"({"width":4294967295,"height":4294967295,"bitrate":4294967295,"rotation":-2147483648,)"
       R"("duration":2147483647,"size":9223372036854775807,"mtime":-9223372036854775808})",
       "path , type 0, 4294967295x4294967295, rotation -2147483648, duration 2147483647, "
       "bitrate 4294967295, size 9223372036854775807, mtime -9223372036854775808"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(Described(Record(c.media)), c.record) << c.media;
  }
}

TEST_F(Answers, PathsInAMediaRecordKeepTheirBytes) {
  EXPECT_STREQ(Record("{\"path\":\"/a \\\"b\\\\ \xC3\xA9 \xFC.jpg\"}").path,
               "/a \"b\\ \xC3\xA9 \xFC.jpg");
}

}  // namespace
}  // namespace vela_test
