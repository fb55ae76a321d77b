// Where the index database lies.
#pragma once

#include <string>

/// Makes the directories above `file` that are missing. A failure shows when the file is opened.
void MakeDirectoryOf(const std::string& file);
