// The documents name every setting and every key of the profile, with the defaults of the program.
#include <gmock/gmock.h>

#include <regex>

#include "checks/configuration_check.h"
#include "configuration/profile_values.h"
#include "configuration/settings.h"
#include "storage/thumb_size_class.h"
#include "support/build_paths.h"
#include "support/files.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

class Documents : public SandboxTest {
 protected:
  static std::string Read(const std::string& name) {
    return ReadFile(SourceDirectory() + '/' + name);
  }

  /// The first groups of all matches, in order.
  static std::vector<std::string> Matches(const std::string& text, const std::string& pattern) {
    const std::regex regex(pattern, std::regex::ECMAScript | std::regex::multiline);
    std::vector<std::string> found;
    for (std::sregex_iterator match(text.begin(), text.end(), regex), end; match != end; ++match) {
      found.push_back((*match)[1]);
    }
    return found;
  }
};

/// The beginning of an entry of a man page, up to its key.
constexpr const char* kEntry = R"(^\.It Ic ([a-z_]+) = )";

/// The default that a man page gives for a key.
std::string DefaultIn(const std::string& page, const std::string& key) {
  const std::string mark = "\nThe default is ";
  const size_t entry = page.find("\n.It Ic " + key + " = ");
  const size_t place = page.find(mark, entry);
  if (entry == std::string::npos || place > page.find("\n.It ", entry + 1)) {
    return "none";
  }
  const size_t begin = place + mark.size();
  return page.substr(begin, page.find_first_of(".,\n", begin) - begin);
}

std::vector<std::string> FindingTexts(const CheckResult& result) {
  EXPECT_THAT(result.unchecked, IsEmpty());
  std::vector<std::string> texts;
  for (const Finding& finding : result.findings) {
    texts.push_back(FindingText(finding));
  }
  return texts;
}

std::vector<std::string> SettingKeys() {
  std::vector<std::string> keys;
  for (const Setting& setting : kSettings) {
    keys.emplace_back(setting.key);
  }
  return keys;
}

TEST_F(Documents, TheManPageHasEverySettingWithItsDefault) {
  const std::string page = Read("docs/velainfo.conf.5");
  EXPECT_THAT(Matches(page, kEntry), UnorderedElementsAreArray(SettingKeys()));
  for (const Setting& setting : kSettings) {
    EXPECT_EQ(DefaultIn(page, setting.key), DefaultText(setting)) << setting.key;
  }
}

TEST_F(Documents, TheExampleOfTheManPageWorksWithTheInstalledProfile) {
  const std::vector<std::string> examples = Matches(
      Read("docs/velainfo.conf.5"), R"(^\.Bd -literal -offset indent\n((?:[^.].*\n)+)\.Ed$)");
  ASSERT_THAT(examples, SizeIs(1));
  EXPECT_THAT(examples[0], HasSubstr("photo_thumb_size_map="));
  WriteFile("/etc/velainfo.conf", examples[0]);
  EXPECT_THAT(FindingTexts(CheckSettings()), IsEmpty());
  EXPECT_THAT(FindingTexts(CheckProfile(SourceDirectory() + "/config/thumb-profiles.conf")),
              IsEmpty());
}

TEST_F(Documents, TheReadmeHasEverySetting) {
  const std::string readme = Read("README.md");
  const std::string table = readme.substr(readme.find("\n| setting |"));
  std::vector<std::string> keys;
  for (const std::string& row : Matches(table.substr(0, table.find("\n\n")), "^\\| (`[^|]*) \\|")) {
    for (const std::string& key : Matches(row, "`([a-z_]+)`")) {
      keys.push_back(key);
    }
  }
  EXPECT_THAT(keys, UnorderedElementsAreArray(SettingKeys()));
}

TEST_F(Documents, TheManPageHasEveryKeyOfTheProfileWithItsDefault) {
  const std::string page = Read("docs/thumb-profiles.conf.5");
  EXPECT_THAT(Matches(page, kEntry),
              UnorderedElementsAre(kFilenameKey, kSizeKey, kQualityKey, kUnsharpKey, kPhaseKey));
  EXPECT_EQ(DefaultIn(page, kSizeKey), std::to_string(kDefaultSize));
  EXPECT_EQ(DefaultIn(page, kQualityKey), std::to_string(kDefaultQuality));
  EXPECT_EQ(DefaultIn(page, kPhaseKey), std::to_string(kDefaultPhase));
}

TEST_F(Documents, TheManPageHasEveryKindOfThumbnailWithItsSizeAndMode) {
  const std::string page = Read("docs/thumb-profiles.conf.5");
  for (const ThumbSizeTraits& kind : kThumbSizeTraits) {
    const std::string row = std::string(rgEAThumbInfo[kind.size].name) + " Ta " +
                            std::to_string(kind.edge) + " Ta " +
                            (kind.fillsArea ? "fills" : "fits");
    EXPECT_THAT(page, HasSubstr("\n.It " + row + "\n"));
  }
}

}  // namespace
}  // namespace vela_test
