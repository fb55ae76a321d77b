#include "ipc/photo_switch.h"

#include <json/value.h>

#include "ipc/absent_daemon.h"
#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"

namespace vela {

namespace {

bool IsTrue(const Json::Value& packet, const char* name) {
  const Json::Value value = packet.isObject() ? packet[name] : Json::Value();
  return value.isConvertibleTo(Json::booleanValue) && value.asBool();
}

}  // namespace

PhotoSwitch AskPhotoSwitch(std::chrono::seconds limit) {
  Json::Value packet(Json::objectValue);
  packet["command"] = "IS_DISABLE_CONVERT_PHOTO";
  const int result =
      AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, static_cast<int>(limit.count()));
  PhotoSwitch answer;
  answer.isNobodyListening = result != 0 && IsNobodyListening(VLIBCErrGet());
  answer.isOff = IsTrue(packet, "success") && IsTrue(packet, "result");
  return answer;
}

}  // namespace vela
