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
  // Neither leak checks nor exit handlers have anything to say about a run that never was.
  _exit(1);
}

void EnvironmentFailureWithErrno(const std::string& what) {
  const int error = errno;
  EnvironmentFailure(what + ": " + std::strerror(error));
}

}  // namespace vela_test
