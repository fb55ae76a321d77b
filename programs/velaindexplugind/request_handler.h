// Carries requests out.
#pragma once

#include <string>

#include "answer.h"
#include "index_store.h"
#include "request.h"
#include "settings.h"

namespace vela {

/// Where a request is to be carried out.
enum class WorkPlace {
  kAtOnce,      ///< needs nothing that could make it wait
  kIndexRead,   ///< reads the index
  kIndexWrite,  ///< writes to it; for IndexWriter
  kFiles,       ///< needs media files, on whatever disk
};

/// Returns the place for a command.
WorkPlace PlaceOf(Command command);

/// Carries requests out, from any thread; all but those that write to the index.
class RequestHandler {
 public:
  explicit RequestHandler(IndexStore& index) : index_(index) {}

  /// Carries one request out. Throws only std::bad_alloc.
  Answer Handle(const Request& request, const Settings& settings) const;

 private:
  Answer GetMedia(const std::string& path) const;
  Answer ReadAnew(const std::string& path) const;
  Answer GetIndexVersion(const std::string& path, int32_t standard) const;

  IndexStore& index_;
};

}  // namespace vela
