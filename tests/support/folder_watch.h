// Events of a folder as they happen, for processes that interfere at a chosen moment.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "support/descriptor.h"

namespace vela_test {

/// Watches folders from the moment it is made; may be used in a child process.
class FolderWatch {
 public:
  /// `events` are IN_CREATE, IN_CLOSE_WRITE and so on.
  FolderWatch(const std::vector<std::string>& folders, uint32_t events);

  /// Calls `react` with the path of each entry and the event, without end.
  [[noreturn]] void Follow(
      const std::function<void(const std::string& path, uint32_t event)>& react) const;

 private:
  Descriptor queue_;
  std::map<int, std::string> folders_;
};

}  // namespace vela_test
