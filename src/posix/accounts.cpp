#include "posix/accounts.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <vector>

namespace vela {

std::optional<gid_t> FindGroup(const std::string& name) {
  std::vector<char> text(16384);
  group entry{};
  group* found = nullptr;
  int error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  while (error == ERANGE) {
    text.resize(text.size() * 2);
    error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  }
  if (found == nullptr) {
    // Some name services say in this way that the name is unknown.
    errno = error == ENOENT || error == ESRCH ? 0 : error;
    return std::nullopt;
  }
  return entry.gr_gid;
}

std::string UserName(uid_t user) {
  const passwd* entry = getpwuid(user);
  return entry == nullptr ? std::to_string(user) : entry->pw_name;
}

uid_t EffectiveUser() {
  return geteuid();
}

}  // namespace vela
