// Tests run as user 0 of their sandbox, to whom permission bits do not apply. This makes them
// apply.
#pragma once

#include <cstdint>

#include "support/users.h"

namespace vela_test {

/// As long as the object exists the calling thread has no capabilities, so that permission bits
/// hold for it (a directory of mode 0555 refuses new files with EACCES). Processes that it starts
/// with exec meanwhile get them back; see DropCapabilities in program.h for those.
class WithoutCapabilities {
 public:
  WithoutCapabilities();
  ~WithoutCapabilities();
  WithoutCapabilities(const WithoutCapabilities&) = delete;
  WithoutCapabilities& operator=(const WithoutCapabilities&) = delete;

 private:
  uint64_t effective_;
};

}  // namespace vela_test
