#include "peer.h"

#include <unistd.h>

namespace vela {

std::optional<ucred> PeerOf(int socket) {
  ucred peer{};
  socklen_t size = sizeof peer;
  if (socket < 0 || getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) return {};
  return peer;
}

/// A version holds for whole trees, whoever owns the photos there: that is for the machine's owner
/// to decide. The rest is for everybody who may connect.
std::string ObjectionTo(Command command, const std::optional<ucred>& peer) {
  if (command != Command::kSetIndexVersion) return {};
  const bool isTrusted = peer && (peer->uid == 0 || peer->uid == geteuid());
  return isTrusted ? "" : "only root and the daemon's own user may set index versions";
}

}  // namespace vela
