#include "support/privileges.h"

#include <cerrno>

#include "support/capabilities.h"
#include "support/environment_failure.h"

namespace vela_test {

namespace {

void MustBeDone(int error) {
  if (error != 0) {
    errno = error;
    EnvironmentFailureWithErrno("cannot change the capabilities");
  }
}

}  // namespace

WithoutCapabilities::WithoutCapabilities() : effective_(0) {
  bool ok = false;
  effective_ = EffectiveCapabilities(&ok);
  MustBeDone(ok ? 0 : errno);
  MustBeDone(SetEffectiveCapabilities(0));
}

WithoutCapabilities::~WithoutCapabilities() {
  MustBeDone(SetEffectiveCapabilities(effective_));
}

}  // namespace vela_test
