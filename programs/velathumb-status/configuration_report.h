// What is wrong in the configuration files.
#pragma once

#include <json/value.h>

#include <iosfwd>
#include <string>

#include "checks/configuration_check.h"

namespace vela {

/// The checked profile file and what was found in it and in the settings.
struct ConfigurationState {
  std::string profileFile;
  CheckResult result;
};

/// Checks the settings and the profile file, with an empty name the one that the services use.
ConfigurationState CheckConfiguration(const std::string& profileFile);

/// Writes a line for each finding.
void WriteConfigurationText(std::ostream& out, const ConfigurationState& state);
Json::Value DescribeConfiguration(const ConfigurationState& state);

}  // namespace vela
