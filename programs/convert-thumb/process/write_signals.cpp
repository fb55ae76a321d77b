#include "process/write_signals.h"

#include <csignal>
#include <cstddef>

namespace vela {

namespace {

constexpr int kSignals[] = {SIGPIPE, SIGXFSZ};
constexpr size_t kCount = sizeof kSignals / sizeof *kSignals;

struct sigaction g_original[kCount];
bool g_isIgnoring = false;

}  // namespace

void IgnoreWriteSignals() {
  struct sigaction ignore = {};
  ignore.sa_handler = SIG_IGN;
  for (size_t i = 0; i < kCount; ++i) {
    sigaction(kSignals[i], &ignore, g_isIgnoring ? nullptr : &g_original[i]);
  }
  g_isIgnoring = true;
}

void RestoreWriteSignals() {
  for (size_t i = 0; g_isIgnoring && i < kCount; ++i) {
    sigaction(kSignals[i], &g_original[i], nullptr);
  }
  g_isIgnoring = false;
}

}  // namespace vela
