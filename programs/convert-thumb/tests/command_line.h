// Builds the command lines that velathumb passes to the converter.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// The options of one thumbnail.
struct ThumbOptions {
  int width = 160;
  int height = 160;
  bool fill = false;
  int quality = 85;
  bool stripProfiles = true;
  bool flatten = false;
  bool autoOrient = true;
  int rotate = 0;       ///< degrees, 0: none
  std::string unsharp;  ///< empty: none
  bool convertToSrgb = true;
};

struct ThumbOutput {
  ThumbOptions options;
  std::string path;  ///< as written in the argument
};

struct CommandLine {
  std::string source;            ///< as written in the argument
  std::string scratchDirectory;  ///< empty: none
  std::vector<ThumbOutput> outputs;

  /// The arguments after argument zero.
  std::vector<std::string> Arguments() const;

  /// The same with other arguments in place of "-thumbnail" and its value: a list for each output.
  std::vector<std::string> Arguments(const std::vector<std::vector<std::string>>& scaling) const;
};

}  // namespace vela_test
