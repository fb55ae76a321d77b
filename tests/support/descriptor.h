// Owners of file descriptors and directory streams.
#pragma once

#include <dirent.h>

#include <memory>

#include "posix/file_descriptor.h"

namespace vela_test {

using Descriptor = vela::FileDescriptor;

struct DirectoryCloser {
  void operator()(DIR* directory) const { closedir(directory); }
};
/// A directory stream, closed with its object.
using DirectoryStream = std::unique_ptr<DIR, DirectoryCloser>;

}  // namespace vela_test
