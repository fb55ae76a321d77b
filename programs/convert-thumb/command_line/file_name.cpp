#include "command_line/file_name.h"

#include <algorithm>
#include <cstddef>

namespace vela {

namespace {

char ToLower(char character) {
  constexpr char kDistance = 'a' - 'A';
  return character >= 'A' && character <= 'Z' ? static_cast<char>(character + kDistance)
                                              : character;
}

bool IsLetterOrDigit(char character) {
  return (character >= '0' && character <= '9') || (character >= 'A' && character <= 'Z') ||
         (character >= 'a' && character <= 'z');
}

}  // namespace

bool EqualsIgnoringCase(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char left, char right) { return ToLower(left) == ToLower(right); });
}

std::string_view ExtensionOf(std::string_view path) {
  const size_t dot = path.find_last_of("./");
  return dot == std::string_view::npos || path[dot] != '.' ? std::string_view()
                                                           : path.substr(dot + 1);
}

std::string DirectoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    return ".";
  }
  return slash == 0 ? "/" : path.substr(0, slash);
}

std::string WithoutDoubledPercents(const std::string& text) {
  std::string plain;
  for (size_t i = 0; i < text.size(); ++i) {
    plain += text[i];
    if (text[i] == '%' && i + 1 < text.size() && text[i + 1] == '%') {
      ++i;
    }
  }
  return plain;
}

OutputArgument SplitOutputArgument(const std::string& argument) {
  if (!argument.empty() && argument.front() == '-') {
    return {};
  }
  const size_t colon = argument.find(':');
  const bool hasFormat =
      colon != std::string::npos && colon > 0 &&
      std::all_of(argument.begin(), argument.begin() + static_cast<std::ptrdiff_t>(colon),
                  IsLetterOrDigit);
  return hasFormat ? OutputArgument{argument.substr(0, colon + 1), argument.substr(colon + 1)}
                   : OutputArgument{"", argument};
}

}  // namespace vela
