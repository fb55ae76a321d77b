#include "queue_report.h"

#include <cerrno>
#include <cstring>
#include <functional>
#include <ostream>

#include "platform/velaindex.h"
#include "storage/creation_queue.h"
#include "storage/velamk_thumb_status.h"
#include "text_encoding.h"

namespace vela {

namespace {

struct QueueFile {
  const char* kind;
  const char* path;
  bool isVideo;
  bool isDeferred;
};

/// The entries that are being processed come first, those that have to wait longest come last.
constexpr QueueFile kQueueFiles[] = {{"photo", kPhotoQueue.tempFile, false, false},
                                     {"photo", kPhotoQueue.file, false, false},
                                     {"video", kVideoQueue.tempFile, true, false},
                                     {"video", kVideoQueue.file, true, false},
                                     {"photo", kDeferredPhotosFile, false, true}};

/// Calls `visit` with each entry of the file, if it exists. Returns their number.
int64_t ReadQueue(const QueueFile& queue, const ScanErrorHandler& onError,
                  const std::function<void(const std::string&)>& visit) {
  int64_t count = 0;
  errno = 0;
  const QueueRead read = ForEachQueueEntry(queue.path, [&](const std::string& entry) {
    if (!entry.empty()) {
      ++count;
      visit(entry);
    }
  });
  if (read != QueueRead::kComplete && errno != ENOENT) {
    onError(queue.path, std::strerror(errno));
  }
  return count;
}

}  // namespace

bool WriteQueueText(std::ostream& out, bool checkVideos, const ScanErrorHandler& onError) {
  int64_t all = 0;
  for (const QueueFile& queue : kQueueFiles) {
    out << queue.kind << " queue " << queue.path << (queue.isDeferred ? ", deferred" : "") << '\n';
    const int64_t count = ReadQueue(queue, onError, [&out](const std::string& entry) {
      out << "    " << ToPlainLine(entry) << '\n';
    });
    out << "    " << count << (count == 1 ? " entry" : " entries");
    if (checkVideos && queue.isVideo) {
      out << ", videos that need work: " << CountVideoQueueWork(queue.path);
    }
    out << '\n';
    all += count;
  }
  return all > 0;
}

bool WriteQueueJson(JsonReport& report, bool checkVideos, const ScanErrorHandler& onError) {
  int64_t all = 0;
  report.BeginList("queues");
  for (const QueueFile& queue : kQueueFiles) {
    Json::Value object;
    object["kind"] = queue.kind;
    object["file"] = queue.path;
    object["deferred"] = queue.isDeferred;
    object["videos_needing_work"] =
        checkVideos && queue.isVideo ? Json::Value(CountVideoQueueWork(queue.path)) : Json::Value();
    report.BeginElement(object, "entries");
    all += ReadQueue(queue, onError, [&report](const std::string& entry) {
      Json::Value line;
      PutBytes(line, "path", entry);
      report.InnerElement(line);
    });
    report.EndElement();
  }
  report.EndList();
  return all > 0;
}

}  // namespace vela
