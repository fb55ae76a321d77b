// Plays the platform's answer about free space. For the one source file of a test program.
#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <string>
#include <utility>

#include "platform/vlibc.h"

namespace vela_test {

/// Answers VLIBGetFsAvailSize for as long as the object lives; without one a volume has plenty.
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
