// Byte strings encoded for the reports.
#include "text_encoding.h"

#include <gmock/gmock.h>

#include <string>

#include "index/strict_json.h"
#include "json_report.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AnyOf;

const std::string kReplacement = "\xef\xbf\xbd";

TEST(ToUtf8Text, KeepsValidText) {
  for (const char* text : {"", "abc", "\x01\x7f", "\xc3\xa4", "\xe2\x82\xac", "\xf0\x9f\x93\xb7"}) {
    EXPECT_EQ(ToUtf8(text), text);
    EXPECT_TRUE(IsUtf8(text)) << text;
  }
}

TEST(ToUtf8Text, ReplacesInvalidBytes) {
  EXPECT_EQ(ToUtf8("a\xff"
                   "b"),
            "a" + kReplacement + "b");
  EXPECT_EQ(ToUtf8("cut \xe2\x82"), "cut " + kReplacement + kReplacement);
  for (const char* text :
       {"\xff", "\x80", "\xc3", "\xed\xa0\x80", "\xc0\xaf", "\xf4\x90\x80\x80"}) {
    EXPECT_FALSE(IsUtf8(text)) << text;
    EXPECT_TRUE(IsUtf8(ToUtf8(text))) << text;
  }
}

TEST(ToHtmlText, EscapesMarkupAndControlCharacters) {
  EXPECT_EQ(ToHtml("<a href=\"x\">&"), "&lt;a href=&quot;x&quot;&gt;&amp;");
  EXPECT_THAT(ToHtml("'"), AnyOf("&#39;", "&#x27;", "&apos;"));
  EXPECT_EQ(ToHtml("\xff<"), kReplacement + "&lt;");
  EXPECT_EQ(ToHtml(""), "");
  EXPECT_EQ(ToHtml("\x01"), "&#x1;");
  EXPECT_EQ(ToHtml("\x7f"), "&#x7f;");
}

TEST(ToBase64Text, MatchesTheTestVectorsOfTheStandard) {
  EXPECT_EQ(ToBase64(""), "");
  EXPECT_EQ(ToBase64("f"), "Zg==");
  EXPECT_EQ(ToBase64("fo"), "Zm8=");
  EXPECT_EQ(ToBase64("foo"), "Zm9v");
  EXPECT_EQ(ToBase64("foobar"), "Zm9vYmFy");
  EXPECT_EQ(ToBase64("\xff\xfe\xfd"), "//79");
}

TEST(ToBase64Text, StaysOnOneLine) {
  EXPECT_EQ(ToBase64(std::string(3000, 'x')).find('\n'), std::string::npos);
  EXPECT_EQ(ToBase64(std::string(3000, 'x')).size(), 4000U);
}

TEST(ToPlainLineText, EscapesControlCharactersAndTheBackslashOnly) {
  EXPECT_EQ(ToPlainLine("a b\n\\\t\x1b\x7f\xc3\xa4\xff"), "a b\\n\\\\\\x09\\x1b\\x7f\xc3\xa4\xff");
  EXPECT_EQ(ToPlainLine(""), "");
}

TEST(ToPlainLineText, EscapesTheControlsFrom80To9fAsCharactersAndAsBytes) {
  EXPECT_EQ(ToPlainLine("a\xc2\x9b"
                        "31mb"),
            "a\\xc2\\x9b31mb");
  EXPECT_EQ(ToPlainLine("\xc2\x80\xc2\x9f"), "\\xc2\\x80\\xc2\\x9f");
  EXPECT_EQ(ToPlainLine("\x9b"
                        "31m\x80\x9f"),
            "\\x9b31m\\x80\\x9f");
}

TEST(ToPlainLineText, KeepsOtherCharactersThatContainSuchBytes) {
  for (const char* text : {"\xc2\xa0", "\xc3\x9b", "\xe2\x80\x93", "\xe6\x97\xa5\xe6\x9c\xac",
                           "\xf0\x9f\x93\xb7", "\xed\x95\x9c"}) {
    EXPECT_EQ(ToPlainLine(text), text);
  }
}

TEST(ToPlainLineText, KeepsInvalidBytesThatAreNotControls) {
  EXPECT_EQ(ToPlainLine("\xa0\xc2 \xff\xfe\xe4.jpg"), "\xa0\xc2 \xff\xfe\xe4.jpg");
  EXPECT_EQ(ToPlainLine("cut \xe2\xac"), "cut \xe2\xac");
}

TEST(PutBytesInJson, AddsTheExactBytesOnlyWhenTheyAreNotUtf8) {
  Json::Value object;
  PutBytes(object, "name", "\xc3\xa4");
  PutBytes(object, "path", "\xe4");
  EXPECT_EQ(object.getMemberNames(), (Json::Value::Members{"name", "path", "path_base64"}));
  EXPECT_EQ(object["name"].asString(), "\xc3\xa4");
  EXPECT_EQ(object["path"].asString(), kReplacement);
  EXPECT_EQ(object["path_base64"].asString(), "5A==");
}

TEST(JsonText, IsOneLine) {
  Json::Value object;
  object["a"] = "x\ny";
  object["b"] = 1;
  EXPECT_EQ(ToJsonText(object), "{\"a\":\"x\\ny\",\"b\":1}");
}

}  // namespace
}  // namespace vela_test
