#include <json/value.h>

#include <cstring>

#include "platform/velaindex.h"

namespace {

void ReadPath(const Json::Value& value, char* out, size_t outSize) {
  const char* begin = nullptr;
  const char* end = nullptr;
  if (!value.isString() || !value.getString(&begin, &end)) {
    return;
  }
  const auto length = static_cast<size_t>(end - begin);
  const bool isPath = length < outSize && memchr(begin, '\0', length) == nullptr;
  if (isPath) {
    memcpy(out, begin, length);
  }
}

int32_t ReadInt32(const Json::Value& value) {
  return value.isInt() ? value.asInt() : 0;
}

uint32_t ReadUint32(const Json::Value& value) {
  return value.isUInt() ? value.asUInt() : 0;
}

int64_t ReadInt64(const Json::Value& value) {
  return value.isInt64() ? value.asInt64() : 0;
}

}  // namespace

int MediaInfoJson2Object(Json::Value& media, VELA_MEDIA_INFO& out) {
  memset(&out, 0, sizeof(out));
  if (!media.isObject()) {
    return -1;
  }
  const Json::Value& members = media;
  ReadPath(members["path"], out.path, sizeof(out.path));
  out.type = ReadInt32(members["type"]);
  out.width = ReadUint32(members["width"]);
  out.height = ReadUint32(members["height"]);
  out.rotation = ReadInt32(members["rotation"]);
  out.duration = ReadInt32(members["duration"]);
  out.bitrate = ReadUint32(members["bitrate"]);
  out.size = ReadInt64(members["size"]);
  out.mtime = ReadInt64(members["mtime"]);
  return 0;
}
