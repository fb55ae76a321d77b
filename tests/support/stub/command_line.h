// What a stub reads from its command line.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// One file that the converter is to write.
struct StubOutput {
  std::string path;
  int width = 64;  ///< box of the "-thumbnail" option before it
  int height = 64;
};

struct StubCommandLine {
  std::string tool;                    ///< base name of the path it was started by
  std::string path;                    ///< that path
  std::vector<std::string> arguments;  ///< argument zero included
  std::string source;                  ///< input of the converter, else the last argument
  std::vector<StubOutput> outputs;     ///< of the converter only
};

StubCommandLine ReadCommandLine(int argc, char** argv);

}  // namespace vela_test
