// Writes finished files.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>

/// Writes the whole file, new (with the permissions that the mask leaves of 0666) or over an old
/// one. False when any byte may not have arrived; what is there of the file is then removed.
bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size);

/// Puts a new file with these permissions (less what the mask takes) in the place of the file at
/// `path`, in one step. False, with errno set, when that fails; the old file is then as it was.
bool ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size, mode_t mode);
