// Requests as they come over the socket.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace vela {

/// Longest request line in bytes, without its newline.
constexpr size_t kRequestMax = 65536;

/// Longest path in bytes.
constexpr size_t kPathMax = 4095;

enum class Command {
  kGetMedia,
  kGetIndexVersion,
  kSetIndexVersion,
  kIsPhotoConvertDisabled,
  kIsVideoConvertDisabled,
  kPostPhotoConvert,
  kPostVideoConvert,
};

/// One request; which fields mean something depends on the command.
struct Request {
  Command command = Command::kIsPhotoConvertDisabled;
  std::string path;                ///< absolute, as the client wrote it
  std::optional<int32_t> version;  ///< kSetIndexVersion; nothing: no version of its own any more
};

/// Returns the command's word on the socket.
const char* CommandWord(Command command);

/// Reads a request line. Returns what is wrong with it in one sentence, empty when nothing is.
/// Throws only std::bad_alloc.
std::string ParseRequest(std::string_view line, Request& request);

}  // namespace vela
