#include "posix/identity.h"

#include <grp.h>
#include <linux/capability.h>
#include <pwd.h>
#include <signal.h>
#include <sys/fsuid.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "posix/folder.h"
#include "posix/log.h"

namespace vela {

namespace {

/// What the system calls expect for "no change".
constexpr auto kNoUser = static_cast<uid_t>(-1);
constexpr auto kNoGroup = static_cast<gid_t>(-1);

/// The capabilities of a process. Plain, because a signal handler uses them.
struct Capabilities {
  __user_cap_data_struct parts[2];
};

/// With a user's identity the process keeps what it needs to go back, and to end the user's tools.
constexpr uint32_t kKeptCapabilities =
    CAP_TO_MASK(CAP_SETUID) | CAP_TO_MASK(CAP_SETGID) | CAP_TO_MASK(CAP_KILL);

bool GetCapabilities(Capabilities& capabilities) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  return syscall(SYS_capget, &header, capabilities.parts) == 0;
}

bool SetCapabilities(const Capabilities& capabilities) {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  return syscall(SYS_capset, &header, capabilities.parts) == 0;
}

// The system calls themselves: the C library's functions involve all threads of the process, of
// which a child shares the memory.
#ifdef SYS_setgroups32
constexpr long kSetGroups = SYS_setgroups32;
constexpr long kSetGroup = SYS_setresgid32;
constexpr long kSetUser = SYS_setresuid32;
#else
constexpr long kSetGroups = SYS_setgroups;
constexpr long kSetGroup = SYS_setresgid;
constexpr long kSetUser = SYS_setresuid;
#endif

bool SetGroups(const std::vector<gid_t>& groups) {
  return syscall(kSetGroups, groups.size(), groups.data()) == 0;
}

uid_t CurrentFileUser() {
  return static_cast<uid_t>(setfsuid(kNoUser));
}

gid_t CurrentFileGroup() {
  return static_cast<gid_t>(setfsgid(kNoGroup));
}

/// The rights to files at one time.
struct Rights {
  uid_t user = 0;
  gid_t group = 0;
  Capabilities capabilities = {};
};

/// The only state of this file. A signal handler may read it at any time.
struct Exchange {
  volatile sig_atomic_t isActive = 0;  ///< an AssumedIdentity exists
  bool isOwn = true;                   ///< this process has its own rights
  Rights own;
  Rights assumed;
  pid_t parent = 0;
  int deathSignal = 0;  ///< that the process asked for at the end of its parent
};

Exchange g_exchange;

/// The kernel forgets the signal when a process changes its rights.
void KeepDeathSignal() {
  if (g_exchange.deathSignal == 0) {
    return;
  }
  prctl(PR_SET_PDEATHSIG, g_exchange.deathSignal);
  if (getppid() != g_exchange.parent) {
    raise(g_exchange.deathSignal);  // the parent ended meanwhile
  }
}

/// Returns false, with errno set, when the rights are not exactly these.
bool TakeRights(const Rights& rights, const Capabilities& whileChanging) {
  SetCapabilities(whileChanging);
  setfsgid(rights.group);
  setfsuid(rights.user);
  // The kernel changes the capabilities with the user.
  bool isDone = SetCapabilities(rights.capabilities);
  if (isDone && (CurrentFileUser() != rights.user || CurrentFileGroup() != rights.group)) {
    errno = EPERM;
    isDone = false;
  }
  const int error = errno;
  KeepDeathSignal();
  errno = error;
  return isDone;
}

bool TakeOwnRights() {
  return TakeRights(g_exchange.own, g_exchange.own.capabilities);
}

bool TakeAssumedRights() {
  return TakeRights(g_exchange.assumed, g_exchange.own.capabilities);
}

/// Returns the supplementary groups of this process.
std::vector<gid_t> OwnGroups() {
  const int count = getgroups(0, nullptr);
  std::vector<gid_t> groups(count < 0 ? 0 : static_cast<size_t>(count));
  const int found = getgroups(static_cast<int>(groups.size()), groups.data());
  groups.resize(found < 0 ? 0 : static_cast<size_t>(found));
  return groups;
}

/// The supplementary groups of this process while it has another identity.
std::vector<gid_t>& KeptGroups() {
  static std::vector<gid_t> groups;
  return groups;
}

bool RememberOwnRights() {
  if (!GetCapabilities(g_exchange.own.capabilities)) {
    return false;
  }
  g_exchange.own.user = geteuid();
  g_exchange.own.group = getegid();
  g_exchange.parent = getppid();
  if (prctl(PR_GET_PDEATHSIG, &g_exchange.deathSignal) != 0) {
    return false;
  }
  KeptGroups() = OwnGroups();
  return true;
}

void ChooseAssumedRights(const Identity& identity) {
  g_exchange.assumed = {identity.user, identity.group, g_exchange.own.capabilities};
  __user_cap_data_struct(&parts)[2] = g_exchange.assumed.capabilities.parts;
  parts[0].effective &= kKeptCapabilities;
  parts[1].effective = 0;
}

std::vector<gid_t> GroupsOf(const passwd& account) {
  int count = 64;
  std::vector<gid_t> groups(static_cast<size_t>(count));
  if (getgrouplist(account.pw_name, account.pw_gid, groups.data(), &count) < 0) {
    groups.resize(static_cast<size_t>(count));
    if (getgrouplist(account.pw_name, account.pw_gid, groups.data(), &count) < 0) {
      return {};
    }
  }
  groups.resize(static_cast<size_t>(count));
  return groups;
}

int Failed(int error) {
  g_exchange.isActive = 0;
  return error;
}

int Assume(const Identity& identity) {
  if (geteuid() != 0 || g_exchange.isActive != 0 || !RememberOwnRights()) {
    return EPERM;
  }
  ChooseAssumedRights(identity);
  if (!SetGroups(identity.groups)) {
    return errno;
  }
  g_exchange.isActive = 1;
  if (!TakeAssumedRights()) {
    const int error = errno;
    TakeOwnRights();
    SetGroups(KeptGroups());
    return Failed(error);
  }
  g_exchange.isOwn = false;
  return 0;
}

}  // namespace

std::optional<Identity> OwnerOf(const std::string& path) {
  struct stat status = {};
  if (const int error = FolderEntry(path).Examine(status); error != 0 || !S_ISDIR(status.st_mode)) {
    errno = error == 0 ? ENOTDIR : error;
    return std::nullopt;
  }
  return Identity{status.st_uid, status.st_gid, {}};
}

Identity AccountIdentity(const Identity& owner) {
  const passwd* account = getpwuid(owner.user);
  return account == nullptr ? owner : Identity{owner.user, account->pw_gid, GroupsOf(*account)};
}

AssumedIdentity::AssumedIdentity(const Identity& identity) : error_(Assume(identity)) {}

AssumedIdentity::~AssumedIdentity() {
  if (error_ != 0) {
    return;
  }
  const int error = errno;
  TakeOwnRights();
  g_exchange.isOwn = true;
  SetGroups(KeptGroups());
  g_exchange.isActive = 0;
  errno = error;
}

OwnIdentity::OwnIdentity() : isChanged_(!g_exchange.isOwn) {
  if (isChanged_) {
    TakeOwnRights();
    g_exchange.isOwn = true;
  }
}

OwnIdentity::~OwnIdentity() {
  if (!isChanged_) {
    return;
  }
  const int error = errno;
  if (!TakeAssumedRights()) {
    LogError("cannot return to the identity of user " + std::to_string(g_exchange.assumed.user));
    _exit(EXIT_FAILURE);
  }
  g_exchange.isOwn = false;
  errno = error;
}

void ResumeOwnIdentity() {
  if (g_exchange.isActive != 0) {
    TakeOwnRights();
  }
}

uid_t FileUser() {
  return g_exchange.isOwn ? geteuid() : g_exchange.assumed.user;
}

int BecomeFileUser() {
  const uid_t user = CurrentFileUser();
  const gid_t group = CurrentFileGroup();
  if (user == geteuid() && group == getegid()) {
    return 0;
  }
  if (syscall(kSetGroup, group, group, group) != 0 || syscall(kSetUser, user, user, user) != 0) {
    return errno;
  }
  return 0;
}

}  // namespace vela
