// Replies to requests.
#pragma once

#include <cstdint>
#include <string>

namespace vela {

struct IndexResult;
struct MediaRecord;

enum class Outcome {
  kDone,     ///< succeeded
  kRefused,  ///< the request was invalid or not permitted
  kFailed,   ///< the media file could not be read
  kFault,    ///< the daemon or the index failed; of interest to the administrator
};

struct Answer {
  std::string line;  ///< the reply; empty when out of memory
  Outcome outcome = Outcome::kFault;
  std::string error;  ///< for the log; empty without an error
};

// Replies as they are sent over the socket: one line of JSON each, including the newline. All of
// these functions throw only std::bad_alloc.

/// The reply when there is not enough memory for any other.
constexpr char kLastResortReply[] = "{\"error\":\"out of memory\",\"success\":false}\n";

std::string FailureReply(const std::string& error);
std::string SuccessReply();
std::string VersionReply(int32_t version);
std::string ResultReply(bool result);

/// The reply contains `path` byte for byte, valid UTF-8 or not.
std::string MediaReply(const std::string& path, const MediaRecord& record);

/// Returns a plain success, or a fault of the index.
Answer IndexAnswer(const IndexResult& result);

}  // namespace vela
