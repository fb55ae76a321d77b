// Replaces the platform's query of free space. For test programs with a single source file.
#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <string>
#include <utility>

#include "platform/vlibc.h"

namespace vela_test {

/// Determines the result of VLIBGetFsAvailSize while the object exists; without one, volumes have
/// plenty of space.
class FreeSpaceFake {
 public:
  using Answer = std::function<uint64_t(const std::string& path)>;

  explicit FreeSpaceFake(Answer answer) { Current() = std::move(answer); }
  ~FreeSpaceFake() { Current() = nullptr; }
  FreeSpaceFake(const FreeSpaceFake&) = delete;
  FreeSpaceFake& operator=(const FreeSpaceFake&) = delete;

  static Answer& Current() {
    static Answer answer;
    return answer;
  }
};

}  // namespace vela_test

uint64_t VLIBGetFsAvailSize(const char* path) {
  const auto& answer = vela_test::FreeSpaceFake::Current();
  return answer ? answer(path) : std::numeric_limits<uint64_t>::max();
}
