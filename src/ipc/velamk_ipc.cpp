#include "ipc/velamk_ipc.h"

#include <json/value.h>

#include <cstdlib>

#include "ipc/absent_daemon.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/identity.h"
#include "posix/log.h"

using namespace vela;

namespace {

constexpr char kLogSource[] = "velamk_ipc";
constexpr int kExchangeSeconds = 1800;

Json::Value MakeRequest(const char* command) {
  Json::Value packet(Json::objectValue);
  packet["command"] = command;
  return packet;
}

/// Returns a member of the reply, null when it is missing.
Json::Value Member(const Json::Value& packet, const char* name) {
  return packet.isObject() ? packet[name] : Json::Value();
}

/// The JSON library throws on a value that it cannot convert; such a reply must not end the
/// program.
bool ToBool(const Json::Value& value) {
  return value.isConvertibleTo(Json::booleanValue) && value.asBool();
}

int ToInt(const Json::Value& value) {
  return value.isConvertibleTo(Json::intValue) ? value.asInt() : 0;
}

/// Returns whether a request has failed, with this platform error, only because nobody listens, and
/// that has been logged before.
bool IsAbsenceKnown(int error) {
  return IsNobodyListening(error) && std::getenv(kAbsentDaemonVariable) != nullptr;
}

/// Replaces the request by the daemon's reply. Returns true when the daemon succeeded; a failure is
/// logged with the operation's `line`, unless it is known that there is no daemon.
bool Exchange(Json::Value& packet, int line) {
  const OwnIdentity own;
  const int result = AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, kExchangeSeconds);
  if (ToBool(Member(packet, "success"))) {
    return true;
  }
  if (result == 0 || !IsAbsenceKnown(VLIBCErrGet())) {
    LogError(kLogSource, line, "fail");
  }
  return false;
}

/// Adds the path that a request is about. Without one there is nothing to ask, which is a failure:
/// it is logged with the operation's `line`, and false is returned.
bool AddPath(const char* path, Json::Value& packet, int line) {
  if (path == nullptr) {
    LogError(kLogSource, line, "fail");
    return false;
  }
  packet["path"] = path;
  return true;
}

/// Does the same as Exchange for a request about `path`.
bool ExchangeAbout(const char* path, Json::Value& packet, int line) {
  return AddPath(path, packet, line) && Exchange(packet, line);
}

bool QuerySwitch(const char* command, int line) {
  Json::Value packet = MakeRequest(command);
  return Exchange(packet, line) && ToBool(Member(packet, "result"));
}

}  // namespace

int GetMediaFromPluginDB(int type, const char* path, VELA_MEDIA_INFO& out) {
  Json::Value packet = MakeRequest("GET_MEDIA_FROM_PLUGIN_DB");
  if (!AddPath(path, packet, 30)) {
    return -1;
  }
  packet["type"] = type;
  if (!Exchange(packet, 30)) {
    return -1;
  }
  Json::Value media = Member(packet, "media");
  if (!media.isObject()) {
    media = Json::Value(Json::objectValue);
  }
  MediaInfoJson2Object(media, out);
  return 0;
}

int GetIndexVersion(const char* path) {
  Json::Value packet = MakeRequest("GET_INDEX_VERSION");
  return ExchangeAbout(path, packet, 57) ? ToInt(Member(packet, "version")) : -1;
}

bool IsDisableConvertVideo() {
  return QuerySwitch("IS_DISABLE_CONVERT_VIDEO", 83);
}

bool IsDisableConvertPhoto() {
  return QuerySwitch("IS_DISABLE_CONVERT_PHOTO", 110);
}

void PostPhotoConvert(const char* path) {
  Json::Value packet = MakeRequest("POST_PHOTO_CONVERT");
  ExchangeAbout(path, packet, 137);
}

void PostVideoConvert(const char* path) {
  Json::Value packet = MakeRequest("POST_VIDEO_CONVERT");
  ExchangeAbout(path, packet, 157);
}
