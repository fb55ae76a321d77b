#include "support/other_user.h"

#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>

#include "support/environment_failure.h"

namespace vela_test {

namespace {

constexpr unsigned kLongestAction = 60;  // seconds

void Become(uid_t user) {
  umask(0);
  if (!HasOtherUsers()) {
    return;
  }
  if (setgroups(0, nullptr) != 0 || setresgid(user, user, user) != 0 ||
      setresuid(user, user, user) != 0) {
    _exit(1);
  }
}

/// Runs `action` in a child process, which ends with the test.
pid_t StartAs(uid_t user, const std::function<bool()>& action) {
  const pid_t test = getpid();
  const pid_t child = fork();
  if (child < 0) {
    EnvironmentFailureWithErrno("cannot start another user's process");
  }
  if (child > 0) {
    return child;
  }
  Become(user);
  // Changing the user clears it.
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  _exit(getppid() == test && action() ? 0 : 1);
}

int Await(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      return -1;
    }
  }
  return status;
}

}  // namespace

void ActAs(uid_t user, const std::function<bool()>& action) {
  const pid_t child = StartAs(user, [&action] {
    alarm(kLongestAction);
    return action();
  });
  if (Await(child) != 0) {
    EnvironmentFailure("another user cannot do what the test wants");
  }
}

void GiveTo(uid_t user, const char* path) {
  if (HasOtherUsers() &&
      fchownat(AT_FDCWD, path, user, static_cast<gid_t>(user), AT_SYMLINK_NOFOLLOW) != 0) {
    EnvironmentFailureWithErrno(std::string("cannot give away ") + path);
  }
}

void LiftProtectionOfTmp() {
  if (chmod("/tmp", 0777) != 0) {
    EnvironmentFailureWithErrno("cannot change the mode of /tmp");
  }
}

UserProcess::UserProcess(uid_t user, const std::function<void()>& action)
    : pid_(StartAs(user, [&action] {
        action();
        return true;
      })) {}

UserProcess::~UserProcess() {
  kill(pid_, SIGKILL);
  Await(pid_);
}

}  // namespace vela_test
