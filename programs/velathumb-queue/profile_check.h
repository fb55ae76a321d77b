// Whether a profile file can be used.
#pragma once

#include <string>

namespace vela {

/// Returns whether velathumb can read the profile file and would make anything by it; a fault is
/// told in the log. Without a usable profile velathumb would pass over every directory, and each
/// entry would count as done.
bool IsProfileUsable(const std::string& profileFile);

}  // namespace vela
