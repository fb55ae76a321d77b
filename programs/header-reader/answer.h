// Answers to questions about one file.
#pragma once

#include "header/header_question.h"
#include "posix/file_descriptor.h"

namespace vela {

/// Answers a question about `file`. Changes the file's position.
HeaderAnswer Answer(const HeaderQuestion& question, const FileDescriptor& file);

}  // namespace vela
