// Creating directories and removing files.
#pragma once

#include <string>

/// Creates the directory `path` with mode 0777 unless it exists. Returns 1 when it exists or was
/// created (any file of that name counts), else 0; errors other than a missing parent are logged.
int checkCreateDir(const std::string& path);

/// Removes every file that matches the shell pattern. Returns 0 when all matches were removed or
/// nothing matched, -1 when a removal failed; the others are still removed.
int RemoveFilesByPattern(const std::string& pattern);
