#include "request_handler.h"

#include <cerrno>
#include <cstring>
#include <ctime>
#include <optional>
#include <utility>

#include "index_answer.h"
#include "index_path.h"
#include "media_reader.h"
#include "reply.h"

namespace vela {

namespace {

/// File systems date changes to up to two seconds. A file that was changed so shortly before its
/// record was read can have been changed once more since, with nothing to tell by.
constexpr int64_t kTimeGrain = 2;

/// How often a file that changes while it is read is read again.
constexpr int kReadTries = 3;

Answer Done(std::string line) {
  return {std::move(line), Outcome::kDone, {}};
}

Answer Failed(const std::string& error) {
  return {FailureReply(error), Outcome::kFailed, error};
}

std::string ErrorText(int error) {
  switch (error) {
    case EISDIR:
    case EINVAL:
      return "not a regular file";
    case ENOENT:
    case ENOTDIR:
      return "there is no such file";
    default:
      return std::strerror(error);
  }
}

bool IsGone(int error) {
  return error == ENOENT || error == ENOTDIR;
}

bool StillHolds(const StoredMedia& media, const FileState& now) {
  return media.record.file == now && now.seconds + kTimeGrain < media.readAt;
}

/// Reads a record that is of one state of the file.
std::string ReadWhole(const std::string& path, StoredMedia& media) {
  FileState after;
  int error = ReadFileState(path, after);
  for (int i = 0; error == 0 && i < kReadTries; ++i) {
    media.record = {};
    media.record.file = after;
    media.readAt = std::time(nullptr);
    std::string problem = ReadMediaHeaders(path, media.record);
    error = ReadFileState(path, after);
    if (error == 0 && after == media.record.file) return problem;
  }
  return error == 0 ? "the file does not stop changing" : ErrorText(error);
}

}  // namespace

WorkPlace PlaceOf(Command command) {
  switch (command) {
    case Command::kGetMedia:
      return WorkPlace::kFiles;
    case Command::kIsPhotoConvertDisabled:
    case Command::kIsVideoConvertDisabled:
      return WorkPlace::kAtOnce;
    case Command::kGetIndexVersion:
      return WorkPlace::kIndexRead;
    default:
      return WorkPlace::kIndexWrite;
  }
}

/// The index is a help here, not a condition: without it the file itself still tells.
Answer RequestHandler::ReadAnew(const std::string& path) const {
  StoredMedia media;
  const std::string problem = ReadWhole(path, media);
  if (!problem.empty()) return Failed(problem);
  const IndexResult stored = index_.StoreMedia(path, media);
  Answer answer = Done(MediaReply(path, media.record));
  if (!stored.IsOk()) answer.error = "index database: " + stored.message;
  return answer;
}

Answer RequestHandler::GetMedia(const std::string& path) const {
  FileState now;
  const int error = ReadFileState(path, now);
  if (error != 0) {
    if (IsGone(error)) index_.RemoveMedia(path);
    return Failed(ErrorText(error));
  }
  std::optional<StoredMedia> stored;
  const IndexResult found = index_.FindMedia(path, stored);
  if (found.IsOk() && stored && StillHolds(*stored, now)) {
    return Done(MediaReply(path, stored->record));
  }
  return ReadAnew(path);
}

Answer RequestHandler::GetIndexVersion(const std::string& path, int32_t standard) const {
  std::optional<int32_t> version;
  const IndexResult result = index_.FindNearestVersion(PlainPath(path), version);
  return result.IsOk() ? Done(VersionReply(version.value_or(standard))) : IndexAnswer(result);
}

Answer RequestHandler::Handle(const Request& request, const Settings& settings) const {
  switch (request.command) {
    case Command::kGetMedia:
      return GetMedia(request.path);
    case Command::kGetIndexVersion:
      return GetIndexVersion(request.path, settings.indexVersion);
    case Command::kIsPhotoConvertDisabled:
      return Done(ResultReply(settings.isPhotoConvertDisabled));
    case Command::kIsVideoConvertDisabled:
      return Done(ResultReply(settings.isVideoConvertDisabled));
    case Command::kSetIndexVersion:
    case Command::kPostPhotoConvert:
    case Command::kPostVideoConvert:
      break;
  }
  return {};
}

}  // namespace vela
