#include "thumb/work_as_owner.h"

#include <cstring>

#include "configuration/settings.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"
#include "posix/accounts.h"
#include "posix/log.h"

namespace vela {

namespace {

bool IsWanted() {
  return EffectiveUser() == 0 &&
         VLIBCFileCheckKeyValue(kSettingsFile, kWorkAsOwnerKey, kYes, 0) == 1;
}

void LogOnce(uid_t user, int error) {
  static bool isLogged = false;
  if (!isLogged) {
    isLogged = true;
    LogError("work_as_owner has no effect: cannot take the identity of user " +
             std::to_string(user) + ": " + std::strerror(error));
  }
}

}  // namespace

WorkAsOwner::WorkAsOwner(const std::string& dir) {
  if (!IsWanted()) {
    return;
  }
  folder_.emplace(dir);
  const std::optional<Identity> owner = OwnerOf(dir);
  mayWork_ = folder_->Error() == 0 && owner;
  if (!owner || owner->user == 0) {
    return;
  }
  identity_.emplace(AccountIdentity(*owner));
  if (identity_->Error() != 0) {
    LogOnce(owner->user, identity_->Error());
  }
}

}  // namespace vela
