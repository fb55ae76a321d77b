// From the arguments to the directories: the recursive walk and the processing of each directory.
#pragma once

#include <string>

struct FTW;
struct stat;

/// Makes the thumbnails of the directory `dirPath` with the profiles of `profileFilePath`. Skips a
/// directory or profile file that does not exist and a directory in which no metadata may be
/// written; a profile file that cannot be loaded is reported on standard error.
void RunDirectoryJob(const std::string& dirPath, const std::string& profileFilePath);

/// The step of the walk; returns the walk's action code.
int RecursiveDirCallback(const char* path, const struct stat* status, int typeFlag,
                         struct FTW* walk);

namespace vela {

/// Runs RunDirectoryJob on `dirPath` and every directory below it on the same file system whose
/// name is to be indexed, a directory before its subdirectories.
void RunDirectoryTree(const std::string& dirPath, const std::string& profileFilePath);

}  // namespace vela
