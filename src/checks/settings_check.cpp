// The check of /etc/velainfo.conf.
#include <cerrno>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#include "checks/checked_file.h"
#include "checks/configuration_check.h"
#include "checks/similar_name.h"
#include "configuration/key_value_text.h"
#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "configuration/text_lines.h"
#include "platform/system_rules.h"

namespace vela {

namespace {

/// Returns what a message about the unknown key ends with.
std::string Suggestion(std::string_view key) {
  std::vector<std::string_view> keys;
  keys.reserve(kSettings.size());
  for (const Setting& setting : kSettings) {
    keys.emplace_back(setting.key);
  }
  const std::string suggestion = SuggestName(key, keys);
  return suggestion.empty() ? "; see velainfo.conf(5)" : suggestion;
}

/// Returns what applies instead of an invalid value.
std::string Consequence(const Setting& setting) {
  if (setting.kind == SettingKind::kTime) {
    return "the number that it begins with is used, or 0";
  }
  return DefaultText(setting) + " is used";
}

class SettingsCheck {
 public:
  explicit SettingsCheck(FindingList& findings) : findings_(findings) {}

  void CheckLine(std::string_view line, int64_t number);

 private:
  void CheckPair(const KeyValueLine& line, int64_t number);
  void CheckUnknown(std::string_view key, int64_t number);
  void CheckMemory(const Setting& setting, const std::string& value, int64_t number);
  void CheckValue(const Setting& setting, const DecodedValue& value, int64_t number);

  FindingList& findings_;
  std::map<std::string, int64_t, std::less<>> firstLines_;  // by key
};

void SettingsCheck::CheckLine(std::string_view line, int64_t number) {
  const KeyValueLine parsed = ParseKeyValueLine(line);
  switch (parsed.kind) {
    case KeyValueLine::Kind::kBlank:
      break;
    case KeyValueLine::Kind::kPair:
      CheckPair(parsed, number);
      break;
    case KeyValueLine::Kind::kInvalid:
      findings_.Warn(number, "the line is ignored: it is neither key=\"value\" nor a comment");
      break;
  }
}

void SettingsCheck::CheckUnknown(std::string_view key, int64_t number) {
  if (key.empty()) {
    findings_.Warn(number, "the line is ignored: it has no key");
  } else if (key == kForeignPauseKey) {
    findings_.Warn(number, std::string(kForeignPauseKey) + " has no effect here; " +
                               kResumeTimeKey + " pauses the conversion");
  } else {
    findings_.Warn(number, "there is no setting " + Quoted(key) + Suggestion(key));
  }
}

void SettingsCheck::CheckPair(const KeyValueLine& line, int64_t number) {
  const Setting* const setting = FindSetting(line.key);
  if (setting == nullptr) {
    CheckUnknown(line.key, number);
    return;
  }
  const auto [first, isFirst] = firstLines_.emplace(line.key, number);
  if (isFirst) {
    CheckValue(*setting, DecodeValue(line.written), number);
    return;
  }
  findings_.Warn(number, std::string(setting->key) + " is already in line " +
                             std::to_string(first->second) + "; this line is ignored");
}

void SettingsCheck::CheckMemory(const Setting& setting, const std::string& value, int64_t number) {
  /// The rows of the smallest thumbnail do not fit into less.
  constexpr size_t kLeastMemory = size_t{1} << 20;
  if (setting.kind == SettingKind::kBytes &&
      ParseByteCount(value).value_or(kLeastMemory) < kLeastMemory) {
    findings_.Add(
        number, Severity::kError,
        std::string(setting.key) + " is less than 1M: " + Quoted(value) + "; photos fail");
  }
}

void SettingsCheck::CheckValue(const Setting& setting, const DecodedValue& value, int64_t number) {
  if (!IsValidValue(setting, value.text)) {
    findings_.Warn(number, std::string(setting.key) + " is not " + ValidValues(setting.kind) +
                               ": " + Quoted(value.text) +
                               (value.lacksClosingQuote ? ", without a closing quote" : "") + "; " +
                               Consequence(setting));
  }
  CheckMemory(setting, value.text, number);
  if (!value.rest.empty() && value.rest.front() != '#') {
    findings_.Warn(number, "the text after the value is ignored: " + Quoted(value.rest));
  }
}

}  // namespace

CheckResult CheckSettings() {
  CheckResult result;
  std::string text;
  int error = 0;
  FindingList findings(kSettingsFile);
  switch (ReadCheckedFile(kSettingsFile, text, error)) {
    case FileRead::kDone:
      break;
    case FileRead::kFaulty:
      if (error != ENOENT) {
        findings.Warn(0, std::string("cannot be read: ") + std::strerror(error) +
                             "; the defaults of all settings are used");
      }
      break;
    case FileRead::kUnchecked:
      result.unchecked.push_back({kSettingsFile, error});
      return result;
  }
  SettingsCheck check(findings);
  for (TextLines lines(text); lines.Next();) {
    check.CheckLine(lines.Line(), lines.Number());
  }
  result.findings = findings.Take();
  return result;
}

}  // namespace vela
