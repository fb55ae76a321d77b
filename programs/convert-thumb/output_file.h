// Writes finished files.
#pragma once

#include <cstddef>
#include <string>

/// Writes the whole file, new (with the permissions that the mask leaves of 0666) or over an old
/// one. False when any byte may not have arrived; what is there of the file is then removed.
bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size);
