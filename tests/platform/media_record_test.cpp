// Media records from the daemon's objects.
#include <json/reader.h>
#include <json/value.h>

#include <cstring>
#include <limits>
#include <sstream>

#include "platform/platform_fixture.h"

namespace vela_test {
namespace {

Json::Value Parse(const std::string& text) {
  std::istringstream stream(text);
  Json::Value value;
  stream >> value;
  return value;
}

/// Reads the object into a record that was filled with other values.
VELA_MEDIA_INFO Read(Json::Value media, int expectedResult = 0) {
  VELA_MEDIA_INFO info;
  memset(&info, 0x5a, sizeof(info));
  EXPECT_EQ(MediaInfoJson2Object(media, info), expectedResult);
  return info;
}

void ExpectEmpty(const VELA_MEDIA_INFO& info) {
  EXPECT_STREQ(info.path, "");
  EXPECT_EQ(info.type, 0);
  EXPECT_EQ(info.width, 0U);
  EXPECT_EQ(info.height, 0U);
  EXPECT_EQ(info.rotation, 0);
  EXPECT_EQ(info.duration, 0);
  EXPECT_EQ(info.bitrate, 0U);
  EXPECT_EQ(info.size, 0);
  EXPECT_EQ(info.mtime, 0);
}

TEST(MediaRecord, TakesAllMembers) {
  const auto info = Read(Parse(R"({"path":"/v/a.mp4","type":2,"width":1920,"height":1080,
      "rotation":90,"duration":125,"bitrate":4294967295,"size":9000000000,"mtime":-5})"));
  EXPECT_STREQ(info.path, "/v/a.mp4");
  EXPECT_EQ(info.type, 2);
  EXPECT_EQ(info.width, 1920U);
  EXPECT_EQ(info.height, 1080U);
  EXPECT_EQ(info.rotation, 90);
  EXPECT_EQ(info.duration, 125);
  EXPECT_EQ(info.bitrate, 4294967295U);
  EXPECT_EQ(info.size, 9000000000);
  EXPECT_EQ(info.mtime, -5);
}

TEST(MediaRecord, IsEmptyForMissingMembers) {
  ExpectEmpty(Read(Parse("{}")));
  const auto info = Read(Parse(R"({"width":7,"unknown":[1,{}]})"));
  EXPECT_EQ(info.width, 7U);
  EXPECT_EQ(info.height, 0U);
}

TEST(MediaRecord, IsEmptyForMembersOfAnotherType) {
  ExpectEmpty(Read(Parse(R"({"path":5,"type":"1","width":"10","height":[],"rotation":{},
      "duration":true,"bitrate":null,"size":1.5,"mtime":"now"})")));
}

TEST(MediaRecord, IsEmptyForMembersOutOfRange) {
  ExpectEmpty(Read(Parse(R"({"type":2147483648,"width":-1,"height":4294967296,
      "rotation":-2147483649,"duration":9999999999,"bitrate":4294967296,
      "size":9223372036854775808,"mtime":1e300})")));
}

TEST(MediaRecord, TakesTheEndsOfTheRanges) {
  const auto info = Read(Parse(R"({"type":-2147483648,"duration":2147483647,"width":4294967295,
      "size":9223372036854775807,"mtime":-9223372036854775808})"));
  EXPECT_EQ(info.type, std::numeric_limits<int32_t>::min());
  EXPECT_EQ(info.duration, std::numeric_limits<int32_t>::max());
  EXPECT_EQ(info.width, std::numeric_limits<uint32_t>::max());
  EXPECT_EQ(info.size, std::numeric_limits<int64_t>::max());
  EXPECT_EQ(info.mtime, std::numeric_limits<int64_t>::min());
}

TEST(MediaRecord, TakesPathsThatFitOnly) {
  Json::Value media(Json::objectValue);
  media["path"] = std::string(4095, 'p');
  EXPECT_EQ(Read(media).path, std::string(4095, 'p'));
  media["path"] = std::string(4096, 'p');
  EXPECT_STREQ(Read(media).path, "");
  media["path"] = std::string("/a\0b", 4);
  EXPECT_STREQ(Read(media).path, "");
  media["path"] = "/\xff\xfe";
  EXPECT_STREQ(Read(media).path, "/\xff\xfe");
}

TEST(MediaRecord, IsClearedWhenThereIsNoObject) {
  for (const char* text : {"[]", "[1]"}) ExpectEmpty(Read(Parse(text), -1));
  ExpectEmpty(Read(Json::Value(), -1));
  ExpectEmpty(Read(Json::Value(5), -1));
  ExpectEmpty(Read(Json::Value("media"), -1));
}

}  // namespace
}  // namespace vela_test
