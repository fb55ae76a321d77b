// Which name was meant by a misspelled one.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace vela {

/// Returns the one of `names` that differs least from `given`, if it is similar to it, ignoring
/// case; otherwise an empty text.
std::string_view FindSimilarName(std::string_view given,
                                 const std::vector<std::string_view>& names);

/// Returns the names with ", " between them.
std::string NameList(const std::vector<std::string_view>& names);

/// Returns "; did you mean NAME?", empty when no name is similar.
std::string SuggestName(std::string_view given, const std::vector<std::string_view>& names);

}  // namespace vela
