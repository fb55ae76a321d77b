// Users and groups of the machine.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace vela {

/// Returns the id of the group `name`, nothing with errno 0 when there is no such group, or with
/// another errno value when that cannot be found out.
std::optional<gid_t> FindGroup(const std::string& name);

/// Returns the name of the user, or the number in decimal when the user has none. Not thread-safe.
std::string UserName(uid_t user);

/// Returns the effective user of this process; 0 is root.
uid_t EffectiveUser();

}  // namespace vela
