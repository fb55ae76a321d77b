// The file-creation mask that the program runs with.
#pragma once

#include <sys/stat.h>

namespace vela_test {

/// Mask 0 for as long as the object lives.
class ZeroMask {
 public:
  ZeroMask() : before_(umask(0)) {}
  ~ZeroMask() { umask(before_); }
  ZeroMask(const ZeroMask&) = delete;
  ZeroMask& operator=(const ZeroMask&) = delete;

 private:
  mode_t before_;
};

}  // namespace vela_test
