// Answers the runner's questions in place of systemd.
#pragma once

#include <atomic>
#include <map>
#include <set>
#include <string>
#include <thread>

#include "support/descriptor.h"

namespace vela_test {

/// What it answers.
struct FakeUnits {
  std::map<std::string, std::string> active;  ///< by unit; "inactive" for all others
  std::set<std::string> enabled;              ///< all others are unknown
};

/// The machine seems to run systemd as long as the object exists.
class FakeSystemd {
 public:
  explicit FakeSystemd(FakeUnits units);
  ~FakeSystemd();
  FakeSystemd(const FakeSystemd&) = delete;
  FakeSystemd& operator=(const FakeSystemd&) = delete;

 private:
  void Serve();

  const FakeUnits units_;
  Descriptor listener_;
  std::atomic<bool> isEnding_{false};
  std::thread thread_;
};

/// Makes the socket of a systemd that accepts connections but never answers.
Descriptor MakeSilentSystemd();

}  // namespace vela_test
