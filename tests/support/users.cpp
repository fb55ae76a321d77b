#include "support/users.h"

#include <fstream>

namespace vela_test {

bool HasOtherUsers() {
  std::ifstream map("/proc/self/uid_map");
  unsigned long inside = 0;
  unsigned long outside = 0;
  unsigned long count = 0;
  map >> inside >> outside >> count;
  return count > 65535;
}

}  // namespace vela_test
