// Who is at the other end of a connection, and what they may ask for.
#pragma once

#include <sys/socket.h>

#include <optional>
#include <string>

#include "request.h"

namespace vela {

/// Returns the process that connected, nothing when it cannot be told.
std::optional<ucred> PeerOf(int socket);

/// Returns why `peer` may not give the command, empty when it may.
std::string ObjectionTo(Command command, const std::optional<ucred>& peer);

}  // namespace vela
