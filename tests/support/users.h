// Other users than user 0, which only a sandbox made by root has.
#pragma once

namespace vela_test {

/// Whether the sandbox has other users and groups than user 0. In a sandbox that an ordinary user
/// made, everything belongs to user 0 and no file can be given away.
bool HasOtherUsers();

}  // namespace vela_test
