// Replies as they go over the socket: one line of JSON each, its newline included. All of these
// throw only std::bad_alloc.
#pragma once

#include <cstdint>
#include <string>

#include "media_record.h"

namespace vela {

/// The reply where there is not even the memory for another one.
constexpr char kLastResortReply[] = "{\"error\":\"out of memory\",\"success\":false}\n";

std::string FailureReply(const std::string& error);
std::string SuccessReply();
std::string VersionReply(int32_t version);
std::string ResultReply(bool result);

/// `path` stands in the reply byte for byte, valid UTF-8 or not.
std::string MediaReply(const std::string& path, const MediaRecord& record);

}  // namespace vela
