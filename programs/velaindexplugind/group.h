// Groups by their names.
#pragma once

#include <sys/types.h>

#include <string>

namespace vela {

/// Finds the number of the group `name`. Returns what went wrong, empty when nothing did.
std::string FindGroup(const std::string& name, gid_t& id);

}  // namespace vela
