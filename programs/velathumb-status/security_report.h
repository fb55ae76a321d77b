// Which mechanisms confine the tools on this machine.
#pragma once

#include <json/value.h>

#include <iosfwd>
#include <string>
#include <vector>

#include "posix/confinement.h"

namespace vela {

/// What the kernel supports, and the exceptions that an administrator has made.
struct SecurityState {
  ConfinementSupport support;
  std::vector<std::string> unconfinedTools;  ///< their paths
};

SecurityState ReadSecurityState();

void WriteSecurityText(std::ostream& out, const SecurityState& state);
Json::Value DescribeSecurity(const SecurityState& state);

}  // namespace vela
