#include "support/environment_failure.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

namespace vela_test {

void EnvironmentFailure(const std::string& what) {
  std::fflush(stdout);
  std::fprintf(stderr, "test environment: %s\n", what.c_str());
  std::fflush(stderr);
  // Leak checks and exit handlers would only confuse: no test has run.
  _exit(1);
}

void EnvironmentFailureWithErrno(const std::string& what) {
  const int error = errno;
  EnvironmentFailure(what + ": " + std::strerror(error));
}

}  // namespace vela_test
