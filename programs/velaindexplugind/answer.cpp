#include "answer.h"

#include <json/value.h>

#include <new>

#include "index/strict_json.h"
#include "index_connection.h"
#include "media_record.h"

namespace vela {

namespace {

std::string ToLine(const Json::Value& value) {
  return ToJsonText(value) + '\n';
}

Json::Value Success() {
  Json::Value reply(Json::objectValue);
  reply["success"] = true;
  return reply;
}

}  // namespace

std::string FailureReply(const std::string& error) {
  Json::Value reply(Json::objectValue);
  reply["success"] = false;
  reply["error"] = error;
  return ToLine(reply);
}

std::string SuccessReply() {
  return ToLine(Success());
}

std::string VersionReply(int32_t version) {
  Json::Value reply = Success();
  reply["version"] = version;
  return ToLine(reply);
}

std::string ResultReply(bool result) {
  Json::Value reply = Success();
  reply["result"] = result;
  return ToLine(reply);
}

std::string MediaReply(const std::string& path, const MediaRecord& record) {
  Json::Value media(Json::objectValue);
  media["path"] = path;
  media["type"] = record.type;
  media["width"] = record.width;
  media["height"] = record.height;
  media["rotation"] = record.rotation;
  media["duration"] = record.duration;
  media["bitrate"] = record.bitrate;
  media["size"] = Json::Int64(record.file.size);
  media["mtime"] = Json::Int64(record.file.seconds);
  Json::Value reply = Success();
  reply["media"] = media;
  return ToLine(reply);
}

Answer IndexAnswer(const IndexResult& result) {
  if (result.IsOk()) {
    return {SuccessReply(), Outcome::kDone, {}};
  }
  const std::string error = "index database: " + result.message;
  return {FailureReply(error), Outcome::kFault, error};
}

}  // namespace vela
