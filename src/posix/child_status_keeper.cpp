#include "posix/child_status_keeper.h"

#include <signal.h>

#include <mutex>

namespace vela {

namespace {

std::mutex g_mutex;
int g_children = 0;
bool g_isReplaced = false;
struct sigaction g_replaced;

bool IsIgnoring(const struct sigaction& action) {
  return action.sa_handler == SIG_IGN || (action.sa_flags & SA_NOCLDWAIT) != 0;
}

struct sigaction WithStatus(struct sigaction action) {
  if (action.sa_handler == SIG_IGN) {
    action.sa_handler = SIG_DFL;
  }
  action.sa_flags &= ~SA_NOCLDWAIT;
  return action;
}

}  // namespace

void KeepChildStatus() {
  const std::lock_guard<std::mutex> lock(g_mutex);
  ++g_children;
  struct sigaction current;
  if (sigaction(SIGCHLD, nullptr, &current) != 0 || !IsIgnoring(current)) {
    return;
  }
  const struct sigaction wanted = WithStatus(current);
  if (sigaction(SIGCHLD, &wanted, nullptr) != 0) {
    return;
  }
  g_replaced = current;
  g_isReplaced = true;
}

void ReleaseChildStatus() {
  const std::lock_guard<std::mutex> lock(g_mutex);
  if (--g_children > 0 || !g_isReplaced) {
    return;
  }
  g_isReplaced = false;
  struct sigaction current;
  if (sigaction(SIGCHLD, nullptr, &current) != 0) {
    return;
  }
  const struct sigaction set = WithStatus(g_replaced);
  // A handler that the program has set in the meantime is kept.
  const bool isOurs = current.sa_handler == set.sa_handler && !IsIgnoring(current);
  if (isOurs) {
    sigaction(SIGCHLD, &g_replaced, nullptr);
  }
}

}  // namespace vela
