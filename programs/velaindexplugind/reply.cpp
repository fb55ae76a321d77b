#include "reply.h"

#include <json/value.h>
#include <json/writer.h>

namespace vela {

namespace {

Json::StreamWriterBuilder MakeWriterBuilder() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  return builder;
}

std::string ToLine(const Json::Value& value) {
  static const Json::StreamWriterBuilder builder = MakeWriterBuilder();
  return Json::writeString(builder, value) + '\n';
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

}  // namespace vela
