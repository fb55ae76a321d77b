// The ready-made steps between fork and exec: async-signal-safe calls only.
#include <signal.h>
#include <sys/resource.h>

#include <cerrno>

#include "support/capabilities.h"
#include "support/program.h"

namespace vela_test {

BeforeExec DropCapabilities() {
  return GiveUpCapabilities;
}

BeforeExec LimitResource(int resource, uint64_t value) {
  return [resource, value] {
    const rlimit limit = {value, value};
    return setrlimit(static_cast<__rlimit_resource>(resource), &limit) == 0 ? 0 : errno;
  };
}

BeforeExec IgnoreSignal(int signal) {
  return [signal] { return ::signal(signal, SIG_IGN) == SIG_ERR ? errno : 0; };
}

BeforeExec BlockSignal(int signal) {
  return [signal] {
    sigset_t blocked;
    sigemptyset(&blocked);
    sigaddset(&blocked, signal);
    return sigprocmask(SIG_BLOCK, &blocked, nullptr) == 0 ? 0 : errno;
  };
}

}  // namespace vela_test
