// Directories by their names, for versions that are set for whole trees.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// Returns the absolute `path` without ".", "..", repeated slashes and a slash at the end. Goes by
/// the text alone: symbolic links are not looked at.
std::string PlainPath(std::string_view path);

/// Returns the directory above the plain path `path`, "" above "/". The result points into `path`,
/// or to a constant.
std::string_view ParentOf(std::string_view path);

}  // namespace vela
