// The parts of file names.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// Returns true when both texts are equal, ignoring the case of ASCII letters.
bool EqualsIgnoringCase(std::string_view a, std::string_view b);

/// Returns the text after the last dot of the file name in `path`; empty when there is no dot.
std::string_view ExtensionOf(std::string_view path);

/// Returns the directory of the file at `path`, "." when the path does not name one.
std::string DirectoryOf(const std::string& path);

/// Returns the text with each "%%" replaced by "%".
std::string WithoutDoubledPercents(const std::string& text);

/// An output argument as ImageMagick reads it.
struct OutputArgument {
  std::string format;  ///< with the colon, "jpg:"; empty when the name is not preceded by one
  std::string name;    ///< a path, perhaps with special meanings; empty when it names no file
};

/// Splits an output argument of which only ImageMagick understands the meaning.
OutputArgument SplitOutputArgument(const std::string& argument);

}  // namespace vela
