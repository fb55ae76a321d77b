// Reads the output of an external tool.
#pragma once

#include <cstdio>
#include <optional>
#include <string>

namespace vela {

/// Owns the stream of a tool started with VLIBCPopen; closing it waits for the tool.
class ToolOutput {
 public:
  /// Takes over `stream`, which may be null when the tool could not be started.
  explicit ToolOutput(FILE* stream) : stream_(stream) {}
  ~ToolOutput();
  ToolOutput(const ToolOutput&) = delete;
  ToolOutput& operator=(const ToolOutput&) = delete;

  bool IsOpen() const { return stream_ != nullptr; }

  /// Returns the stream's descriptor.
  int Descriptor() const { return fileno(stream_); }

  /// Returns the next line without its newline, or a piece of 255 bytes of a longer one; nothing at
  /// the end of the output.
  std::optional<std::string> ReadLine();

 private:
  FILE* stream_;
};

/// A line of the form "name: value".
struct TagLine {
  std::string name;   ///< as written
  std::string value;  ///< without white space at its ends
};

/// Splits a line at its first colon; nothing when there is no colon or nothing after it.
std::optional<TagLine> SplitTagLine(const std::string& line);

}  // namespace vela
