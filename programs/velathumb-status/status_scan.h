// Scans directories for their status.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "status_report.h"

namespace vela {

/// What to scan.
struct ScanOptions {
  bool recursive = false;    ///< including everything below the directories
  bool checkVideos = false;  ///< videos too, which removes bad thumbnails and conversions
};

/// Receives the path of something that could not be checked, and why.
using ScanErrorHandler = std::function<void(const std::string& path, const std::string& message)>;

/// Scans the directories one after the other, each once however often it is found, and passes the
/// results to `sink`. Those of a tree are sorted by the bytes of their paths.
void ScanStatus(const std::vector<std::string>& directories, const ScanOptions& options,
                StatusSink& sink, const ScanErrorHandler& onError);

}  // namespace vela
