#include "configuration_report.h"

#include <ostream>

#include "json_report.h"
#include "platform/system_rules.h"
#include "text_encoding.h"

namespace vela {

ConfigurationState CheckConfiguration(const std::string& profileFile) {
  ConfigurationState state;
  state.profileFile = profileFile.empty() ? DefaultProfileFile() : profileFile;
  state.result = CheckSettings();
  state.result.Add(CheckProfile(state.profileFile));
  return state;
}

void WriteConfigurationText(std::ostream& out, const ConfigurationState& state) {
  for (Finding finding : state.result.findings) {
    finding.file = ToPlainLine(finding.file);
    out << FindingText(finding) << '\n';
  }
}

Json::Value DescribeConfiguration(const ConfigurationState& state) {
  Json::Value object;
  object["settings"] = kSettingsFile;
  PutBytes(object, "profile", state.profileFile);
  object["findings"] = Json::Value(Json::arrayValue);
  for (const Finding& finding : state.result.findings) {
    Json::Value entry;
    PutBytes(entry, "file", finding.file);
    entry["line"] = finding.line == 0 ? Json::Value() : Json::Value(Json::Int64{finding.line});
    entry["severity"] = SeverityName(finding.severity);
    entry["message"] = finding.message;
    object["findings"].append(entry);
  }
  return object;
}

}  // namespace vela
