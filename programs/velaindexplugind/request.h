// Requests as they are received from the socket.
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

/// One request; which of the fields are used depends on the command.
struct Request {
  Command command = Command::kIsPhotoConvertDisabled;
  std::string path;                ///< absolute, as the client wrote it
  std::optional<int32_t> version;  ///< for kSetIndexVersion; nothing: remove the version
};

/// Returns the command's name in requests.
const char* CommandName(Command command);

/// Parses a request line. Returns an error message, empty on success. Throws only std::bad_alloc.
std::string ParseRequest(std::string_view line, Request& request);

}  // namespace vela
