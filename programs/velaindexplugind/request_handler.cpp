#include "request_handler.h"

#include <cerrno>
#include <cstring>
#include <ctime>
#include <optional>
#include <utility>

#include "media_record.h"
#include "posix/accounts.h"

namespace vela {

namespace {

/// File times are accurate to two seconds on some file systems. A file that was changed so shortly
/// before its record was read may have changed again since with the same time.
constexpr int64_t kTimeResolution = 2;

/// Maximum number of attempts to read a file that keeps changing.
constexpr int kReadAttempts = 3;

Answer Done(std::string line) {
  return {std::move(line), Outcome::kDone, {}};
}

Answer Failed(const std::string& error) {
  return {FailureReply(error), Outcome::kFailed, error};
}

std::string ErrorText(int error) {
  switch (error) {
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

bool IsUpToDate(const StoredMedia& media, const FileState& now) {
  return media.record.file == now && now.seconds + kTimeResolution < media.readAt;
}

/// Reads a record while the file does not change. Returns an error message, empty on success.
std::string ReadConsistently(const std::string& path, StoredMedia& media) {
  FileState after;
  int error = ReadFileState(path, after);
  for (int i = 0; error == 0 && i < kReadAttempts; ++i) {
    media.record = {};
    media.record.file = after;
    media.readAt = std::time(nullptr);
    std::string problem = ReadMediaHeaders(path, media.record);
    error = ReadFileState(path, after);
    if (error == 0 && after == media.record.file) {
      return problem;
    }
  }
  return error == 0 ? "the file keeps changing" : ErrorText(error);
}

}  // namespace

WorkPlace PlaceOf(Command command) {
  switch (command) {
    case Command::kGetMedia:
      return WorkPlace::kFiles;
    case Command::kIsPhotoConvertDisabled:
    case Command::kIsVideoConvertDisabled:
      return WorkPlace::kEventLoop;
    case Command::kGetIndexVersion:
      return WorkPlace::kIndexRead;
    default:
      return WorkPlace::kIndexWrite;
  }
}

/// A version applies to a whole tree with the photos of all its owners, so only
/// the administrator may set it. Every user who can connect may send the other commands.
std::string ObjectionTo(Command command, const std::optional<ucred>& peer) {
  if (command != Command::kSetIndexVersion) {
    return {};
  }
  const bool isTrusted = peer && (peer->uid == 0 || peer->uid == EffectiveUser());
  return isTrusted ? "" : "only root and the daemon's own user may set index versions";
}

/// A failure of the index does not matter here: the record comes from the file itself.
Answer RequestHandler::ReadRecord(const std::string& path) const {
  StoredMedia media;
  const std::string problem = ReadConsistently(path, media);
  if (!problem.empty()) {
    return Failed(problem);
  }
  const IndexResult stored = index_.StoreMedia(path, media);
  Answer answer = Done(MediaReply(path, media.record));
  if (!stored.IsOk()) {
    answer.error = "index database: " + stored.message;
  }
  return answer;
}

Answer RequestHandler::GetMedia(const std::string& path) const {
  FileState now;
  const int error = ReadFileState(path, now);
  if (error != 0) {
    if (IsGone(error)) {
      index_.RemoveMedia(path);
    }
    return Failed(ErrorText(error));
  }
  std::optional<StoredMedia> stored;
  const IndexResult found = index_.FindMedia(path, stored);
  if (found.IsOk() && stored && IsUpToDate(*stored, now)) {
    return Done(MediaReply(path, stored->record));
  }
  return ReadRecord(path);
}

Answer RequestHandler::GetIndexVersion(const std::string& path, int32_t defaultVersion) const {
  std::optional<int32_t> version;
  const IndexResult result = index_.FindNearestVersion(PlainPath(path), version);
  return result.IsOk() ? Done(VersionReply(version.value_or(defaultVersion))) : IndexAnswer(result);
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
