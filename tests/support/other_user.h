// Other users of the machine, for tests of what a user may do to a program that runs as user 0.
#pragma once

#include <sys/types.h>

#include <functional>

#include "support/users.h"

namespace vela_test {

/// A user who owns a photo directory, and one who wants to do harm.
constexpr uid_t kOwner = 12346;
constexpr uid_t kAttacker = 12345;

/// Runs `action` in a child process with the user's identity (no groups, no capabilities, umask 0)
/// and waits for it. An action that returns false or does not return in a minute ends the test
/// program: an attack that cannot be made proves nothing.
void ActAs(uid_t user, const std::function<bool()>& action);

/// Makes /tmp an ordinary directory until the next reset of the sandbox. In one where only the
/// owner of a file may remove it, many kernels refuse to follow links of other users or to open
/// their pipes and files (fs.protected_symlinks and the like), before the program under test does.
void LiftProtectionOfTmp();

/// Makes the user the owner of the file, links not followed; does nothing without other users.
void GiveTo(uid_t user, const char* path);

/// A process with the user's identity that runs `action`, until that returns or the object ends.
/// The action may use what the test has made before, but not report failures of the test.
class UserProcess {
 public:
  UserProcess(uid_t user, const std::function<void()>& action);
  ~UserProcess();
  UserProcess(const UserProcess&) = delete;
  UserProcess& operator=(const UserProcess&) = delete;

 private:
  pid_t pid_;
};

}  // namespace vela_test
