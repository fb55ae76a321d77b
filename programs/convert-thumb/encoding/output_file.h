// Writes finished files.
#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <string>

namespace vela {

/// Writes the whole file, new (with the permissions that the mask leaves of 0666) or over an old
/// one; a character device is written to as well. False when any byte may not have arrived, or when
/// something else has the name; what is there of the file is then removed. Any thread may call it.
bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size);

/// How an attempt to replace a file ended.
enum class Replacement {
  kDone,
  kFailed,      ///< with errno set
  kImpossible,  ///< no new file like the old one can be made there
};

/// Puts a new file in the place of the file at `path`, in one step and with nothing but the
/// content changed of what `former`, the old one's status, tells: owner, group and permissions. The
/// old file is as it was when that does not succeed. Called while there is one thread.
Replacement ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size,
                        const struct stat& former);

/// Whether the open file has extended attributes, access control lists included.
bool HasExtendedAttributes(int descriptor);

}  // namespace vela
