#include "group.h"

#include <grp.h>

#include <cerrno>
#include <vector>

namespace vela {

std::string FindGroup(const std::string& name, gid_t& id) {
  std::vector<char> text(16384);
  group entry{};
  group* found = nullptr;
  int error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  while (error == ERANGE) {
    text.resize(text.size() * 2);
    error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  }
  if (found == nullptr) return "there is no group " + name;
  id = entry.gr_gid;
  return {};
}

}  // namespace vela
