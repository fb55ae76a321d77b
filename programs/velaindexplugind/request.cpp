#include "request.h"

#include <json/value.h>

#include <algorithm>
#include <iterator>

#include "index/strict_json.h"

namespace vela {

namespace {

struct CommandForm {
  const char* name;
  Command command;
  bool hasPath;
};

constexpr CommandForm kCommands[] = {
    {"GET_MEDIA_FROM_PLUGIN_DB", Command::kGetMedia, true},
    {"GET_INDEX_VERSION", Command::kGetIndexVersion, true},
    {"SET_INDEX_VERSION", Command::kSetIndexVersion, true},
    {"IS_DISABLE_CONVERT_PHOTO", Command::kIsPhotoConvertDisabled, false},
    {"IS_DISABLE_CONVERT_VIDEO", Command::kIsVideoConvertDisabled, false},
    {"POST_PHOTO_CONVERT", Command::kPostPhotoConvert, true},
    {"POST_VIDEO_CONVERT", Command::kPostVideoConvert, true},
};

std::string_view TextOf(const Json::Value& string) {
  const char* begin = nullptr;
  const char* end = nullptr;
  string.getString(&begin, &end);
  return {begin, static_cast<size_t>(end - begin)};
}

/// JsonCpp also accepts 1.0 as an integer.
bool IsInteger(const Json::Value& value) {
  const bool isWhole = value.type() == Json::intValue || value.type() == Json::uintValue;
  return isWhole && value.isInt();
}

std::string TakePath(const Json::Value& object, Request& request) {
  if (!object.isMember("path")) {
    return "the member path is missing";
  }
  const Json::Value& path = object["path"];
  if (!path.isString()) {
    return "path is not a string";
  }
  const std::string_view text = TextOf(path);
  if (text.empty()) {
    return "path is empty";
  }
  if (text.size() > kPathMax) {
    return "path is longer than 4095 bytes";
  }
  if (text.find('\0') != std::string_view::npos) {
    return "path contains a NUL byte";
  }
  if (text.front() != '/') {
    return "path does not begin with a slash";
  }
  request.path = text;
  return {};
}

std::string CheckType(const Json::Value& object) {
  if (!object.isMember("type")) {
    return "the member type is missing";
  }
  return IsInteger(object["type"]) ? "" : "type is not an integer";
}

std::string TakeVersion(const Json::Value& object, Request& request) {
  if (!object.isMember("version")) {
    return "the member version is missing";
  }
  const Json::Value& version = object["version"];
  request.version.reset();
  if (version.isNull()) {
    return {};
  }
  if (!IsInteger(version) || version.asInt() < 0) {
    return "version is neither an integer from 0 to 2147483647 nor null";
  }
  request.version = version.asInt();
  return {};
}

std::string FindCommand(const Json::Value& object, const CommandForm*& form) {
  if (!object.isMember("command")) {
    return "the member command is missing";
  }
  const Json::Value& command = object["command"];
  if (!command.isString()) {
    return "command is not a string";
  }
  const std::string_view name = TextOf(command);
  const auto* found = std::find_if(std::begin(kCommands), std::end(kCommands),
                                   [name](const CommandForm& each) { return name == each.name; });
  if (found == std::end(kCommands)) {
    return "the command is unknown";
  }
  form = found;
  return {};
}

}  // namespace

const char* CommandName(Command command) {
  const auto* found =
      std::find_if(std::begin(kCommands), std::end(kCommands),
                   [command](const CommandForm& each) { return command == each.command; });
  return found == std::end(kCommands) ? "" : found->name;
}

std::string ParseRequest(std::string_view line, Request& request) {
  Json::Value object;
  if (!ReadJsonObject(line, DuplicateKeys::kRejected, object)) {
    return "the request is not one JSON object";
  }
  const CommandForm* form = nullptr;
  std::string mistake = FindCommand(object, form);
  if (!mistake.empty()) {
    return mistake;
  }
  request.command = form->command;
  if (form->hasPath) {
    mistake = TakePath(object, request);
  }
  if (mistake.empty() && form->command == Command::kGetMedia) {
    mistake = CheckType(object);
  }
  if (mistake.empty() && form->command == Command::kSetIndexVersion) {
    mistake = TakeVersion(object, request);
  }
  return mistake;
}

}  // namespace vela
