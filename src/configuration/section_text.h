// The text of configuration files with sections: `[section]`, `key = value`, comments.
#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

namespace vela {

/// A larger file is rejected, bytes.
inline constexpr size_t kLargestSectionText = size_t{64} << 20;

/// A line of such a file. Names and values are without the white space around them.
struct SectionLine {
  enum class Kind {
    kBlank,    ///< blank, or a comment
    kSection,  ///< the beginning of the section `name`
    kPair,     ///< the key `name` with its value
    kInvalid,  ///< none of these
  };
  Kind kind = Kind::kBlank;
  std::string_view name = {};
  std::string_view value = {};
};

/// Parses a line, without its newline. The first line of a file may begin with a byte order mark.
/// The result refers to the text of the line.
SectionLine ParseSectionLine(std::string_view line, bool isFirstLine);

/// The number at the beginning of a value, and what follows it.
struct LeadingInteger {
  int number = 0;
  std::string_view rest = {};
};

/// Parses the decimal integer, with or without a sign, that the text begins with. A number that
/// does not fit becomes the nearest one that does. Returns nothing when there is no number.
std::optional<LeadingInteger> ParseLeadingInteger(std::string_view text);

}  // namespace vela
