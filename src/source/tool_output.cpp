#include "source/tool_output.h"

#include "platform/velaindex.h"
#include "platform/vlibc.h"

namespace vela {

ToolOutput::~ToolOutput() {
  if (IsOpen()) {
    VLIBCPclose(stream_);
  }
}

std::optional<std::string> ToolOutput::ReadLine() {
  char buffer[256] = "";
  if (std::fgets(buffer, sizeof buffer, stream_) == nullptr) {
    return std::nullopt;
  }
  std::string line = buffer;
  if (!line.empty() && line.back() == '\n') {
    line.pop_back();
  }
  return line;
}

std::optional<TagLine> SplitTagLine(const std::string& line) {
  const std::size_t colon = line.find(':');
  if (colon == std::string::npos || colon + 1 == line.size()) {
    return std::nullopt;
  }
  std::string value = line.substr(colon + 1);
  StringTrim(value.data());
  return TagLine{line.substr(0, colon), value.c_str()};
}

}  // namespace vela
