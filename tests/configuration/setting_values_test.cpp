// The table of settings, and the values that are valid.
#include <gmock/gmock.h>

#include <set>

#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

TEST(Settings, HaveEachKeyOnce) {
  std::set<std::string> keys;
  for (const Setting& setting : kSettings) {
    EXPECT_TRUE(keys.insert(setting.key).second) << setting.key;
    EXPECT_EQ(FindSetting(setting.key), &setting);
  }
  EXPECT_EQ(FindSetting("tool_timeouts"), nullptr);
  EXPECT_EQ(FindSetting("Tool_timeout"), nullptr);
  EXPECT_EQ(FindSetting(""), nullptr);
}

TEST(Settings, HaveValidDefaults) {
  for (const Setting& setting : kSettings) {
    EXPECT_TRUE(IsValidValue(setting, DefaultText(setting))) << setting.key;
  }
}

struct ValuesCase : NamedCase {
  const char* key;
  std::vector<std::string> valid;
  std::vector<std::string> invalid;
};

class SettingValues : public testing::TestWithParam<ValuesCase> {};

TEST_P(SettingValues, AreValidOrNot) {
  const Setting* const setting = FindSetting(GetParam().key);
  ASSERT_NE(setting, nullptr);
  for (const std::string& value : GetParam().valid) {
    EXPECT_TRUE(IsValidValue(*setting, value)) << value;
  }
  for (const std::string& value : GetParam().invalid) {
    EXPECT_FALSE(IsValidValue(*setting, value)) << value;
  }
}

const ValuesCase kValues[] = {
    {"SizeMap",
     "photo_thumb_size_map",
     {"0", "1", "63", "007"},
     {"64", "99", "-1", "", "+1", "3f", "1 "}},
    {"Seconds",
     "tool_timeout",
     {"0", "600", "99999999999999999999"},
     {"soon", "-1", "", "1.5", "10s"}},
    {"Pixels",
     "raw_pixel_limit",
     {"0", "500000000", "18446744073709551615"},
     {"18446744073709551616", "1M", "-1", ""}},
    {"Bytes",
     "convert_memory_limit",
     {"1", "512M", "512m", "1g", "64K", ""},
     {"0", "M", "512MB", "1T", "-1", "99999999999999999999", "18446744073709551615G"}},
    {"Switch", "work_as_owner", {"yes", "no"}, {"", "Yes", "true", "1", "yes "}},
    {"Time",
     "thumb_conv_resume_time",
     {"", "0", "1794614400", "-1"},
     {"soon", "-", "--1", "10 s", "1e9"}},
    {"Version", "index_version", {"0", "2147483647"}, {"2147483648", "-1", "", "1.0"}},
};

INSTANTIATE_TEST_SUITE_P(Settings, SettingValues, testing::ValuesIn(kValues), CaseName());

TEST(ByteCount, IsMultipliedByItsSuffix) {
  const std::pair<const char*, size_t> cases[] = {
      {"3", 3}, {"3K", 3072}, {"3M", 3145728}, {"2g", 2147483648}};
  for (const auto& [text, bytes] : cases) {
    EXPECT_EQ(ParseByteCount(text), bytes) << text;
  }
}

TEST(SecondsText, OfMoreThanFourBytesIsTheLargest) {
  EXPECT_EQ(ParseSeconds("4294967295"), std::chrono::seconds(4294967295));
  EXPECT_EQ(ParseSeconds("4294967296"), std::chrono::seconds(4294967295));
}

}  // namespace
}  // namespace vela_test
