// What the header reader gives up before it reads a file.
#pragma once

namespace vela {

/// From now on this process has an ordinary user's identity, no access to files other than its open
/// descriptors, little memory and processor time, and can only make the system calls that parsing
/// needs. It ends with its parent. Restrictions that the kernel does not support are skipped.
/// Returns 0, or the errno value of a restriction that is supported and failed.
int EnterConfinement();

}  // namespace vela
