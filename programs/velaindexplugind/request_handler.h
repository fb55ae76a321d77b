// Carries out requests.
#pragma once

#include <optional>
#include <string>

#include "answer.h"
#include "index_store.h"
#include "posix/local_socket.h"
#include "request.h"
#include "settings.h"

namespace vela {

/// Where a request is carried out.
enum class WorkPlace {
  kEventLoop,   ///< the event loop: it never waits
  kIndexRead,   ///< the thread that reads the index
  kIndexWrite,  ///< the thread that writes to the index, in IndexWriter
  kFiles,       ///< the threads that read media files, possibly from slow disks
};

/// Returns where a command is carried out.
WorkPlace PlaceOf(Command command);

/// Returns why `peer` is not permitted to give the command, empty when it is. Without a peer, the
/// client is unknown.
std::string ObjectionTo(Command command, const std::optional<ucred>& peer);

/// Carries out all requests but those that write to the index, from any thread.
class RequestHandler {
 public:
  explicit RequestHandler(IndexStore& index) : index_(index) {}

  /// Carries out one request. Throws only std::bad_alloc.
  Answer Handle(const Request& request, const Settings& settings) const;

 private:
  Answer GetMedia(const std::string& path) const;
  Answer ReadRecord(const std::string& path) const;
  Answer GetIndexVersion(const std::string& path, int32_t defaultVersion) const;

  IndexStore& index_;
};

}  // namespace vela
