#include "storage/unfinished_directories.h"

#include <cerrno>
#include <chrono>
#include <string_view>
#include <thread>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/file_lock.h"
#include "posix/files.h"

namespace vela {

namespace {

constexpr char kFile[] = "/var/run/velathumb.unfinished";
/// Without a runner nobody removes the notes.
constexpr size_t kMostBytes = size_t{1} << 20;
/// Paths can contain newlines.
constexpr char kEndOfNote = '\0';

std::string ToText(const UnfinishedDirectory& note) {
  return static_cast<char>(note.reason) + note.path + kEndOfNote;
}

/// Opens and locks the file. Nobody but its owner can open it, so its lock is held for moments
/// only.
FileDescriptor OpenNotes() {
  constexpr int kTries = 100;
  constexpr std::chrono::milliseconds kPause(5);
  FileDescriptor file;
  int error = LockFile(kFile, file);
  for (int i = 0; error == EWOULDBLOCK && i < kTries; ++i) {
    std::this_thread::sleep_for(kPause);
    error = LockFile(kFile, file);
  }
  if (error != 0 || !IsPrivateFile(file.Get())) {
    file.Reset();
  }
  return file;
}

/// Calls `visit` with the text of each complete note.
void ForEachNote(std::string_view text, const std::function<void(std::string_view)>& visit) {
  for (size_t end = text.find(kEndOfNote); end != std::string_view::npos;
       end = text.find(kEndOfNote)) {
    visit(text.substr(0, end + 1));
    text.remove_prefix(end + 1);
  }
}

bool HasNote(std::string_view notes, std::string_view note) {
  bool isFound = false;
  ForEachNote(notes, [&](std::string_view other) { isFound = isFound || other == note; });
  return isFound;
}

/// Replaces the content by a text that is not longer, which needs no new space.
void Shorten(int fd, std::string_view text) {
  if (Rewind(fd) == 0 && WriteAll(fd, text) == 0) {
    SetFileSize(fd, static_cast<int64_t>(text.size()));
  }
}

}  // namespace

void ExpectUnfinishedDirectories() {
  OpenNotes();
}

void NoteUnfinishedDirectory(const std::string& directory, UnfinishedReason reason) {
  if (!ExamineFile(kFile)) {
    return;
  }
  const FileDescriptor file = OpenNotes();
  std::string notes;
  if (!file.IsOpen() || ReadToEnd(file.Get(), notes) != 0) {
    return;
  }
  std::string note = ToText({reason, directory});
  if (notes.size() + note.size() > kMostBytes) {
    note = ToText({UnfinishedReason::kUnknown, ""});
  }
  if (!HasNote(notes, note) && WriteAll(file.Get(), note) != 0) {
    SetFileSize(file.Get(), static_cast<int64_t>(notes.size()));
  }
}

std::vector<UnfinishedDirectory> TakeUnfinishedDirectories(const NoteFilter& isTaken) {
  std::vector<UnfinishedDirectory> taken;
  const auto status = ExamineFile(kFile);
  if (!status || status->size == 0) {
    return taken;
  }
  const FileDescriptor file = OpenNotes();
  std::string notes;
  if (!file.IsOpen() || ReadToEnd(file.Get(), notes) != 0) {
    return taken;
  }
  std::string kept;
  ForEachNote(notes, [&](std::string_view text) {
    const UnfinishedDirectory note = {static_cast<UnfinishedReason>(text.front()),
                                      std::string(text.substr(1, text.size() - 2))};
    if (isTaken(note)) {
      taken.push_back(note);
    } else {
      kept += text;
    }
  });
  if (kept.size() < notes.size()) {
    Shorten(file.Get(), kept);
  }
  return taken;
}

}  // namespace vela
