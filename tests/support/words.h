// Command lines as lists of words.
#pragma once

#include <sstream>
#include <string>
#include <vector>

namespace vela_test {

using Words = std::vector<std::string>;

/// The words of a text, which are separated by spaces.
inline Words WordsOf(const std::string& text) {
  std::istringstream stream(text);
  Words words;
  for (std::string word; stream >> word;) {
    words.push_back(word);
  }
  return words;
}

/// The lists one after the other.
inline Words Joined(const std::vector<Words>& lists) {
  Words joined;
  for (const Words& list : lists) {
    joined.insert(joined.end(), list.begin(), list.end());
  }
  return joined;
}

}  // namespace vela_test
