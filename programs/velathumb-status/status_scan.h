// Asks the library how directories stand.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "status_report.h"

namespace vela {

/// What a scan is to look at.
struct ScanOptions {
  bool recursive = false;    ///< also below the directories
  bool checkVideos = false;  ///< videos too, with the removals that are part of their check
};

/// Takes the path of what could not be looked at, and why.
using ScanErrorHandler = std::function<void(const std::string& path, const std::string& message)>;

/// Scans the directories one after the other, each once however often it is met, and hands what is
/// found to `sink`.
void ScanStatus(const std::vector<std::string>& directories, const ScanOptions& options,
                StatusSink& sink, const ScanErrorHandler& onError);

}  // namespace vela
