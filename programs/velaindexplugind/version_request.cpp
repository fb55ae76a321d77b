#include "version_request.h"

#include <json/value.h>

#include <iostream>
#include <string>

#include "ipc/velamk_ipc.h"
#include "platform/velaindex.h"

namespace vela {

namespace {

constexpr int kTimeout = 60;  // seconds

std::string ReasonOf(const Json::Value& reply) {
  const Json::Value& error = reply["error"];
  return error.isString() ? error.asString() : "the daemon gave no reason";
}

}  // namespace

int RequestVersion(const Options& options) {
  Json::Value packet(Json::objectValue);
  packet["command"] = "SET_INDEX_VERSION";
  packet["path"] = options.versionDirectory;
  packet["version"] = options.isVersionRemoved ? Json::Value() : Json::Value(options.version);
  std::string reason;
  if (AutoSendRecvPacket(PluginDaemonSocketPath, -1, packet, kTimeout) != 0) {
    reason = "no daemon answers at " + std::string(PluginDaemonSocketPath);
  } else if (packet["success"] == Json::Value(true)) {
    return 0;
  } else {
    reason = ReasonOf(packet);
  }
  std::cerr << "velaindexplugind: " << reason << '\n';
  return 1;
}

}  // namespace vela
