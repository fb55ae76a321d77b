#include "progress_line.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "entry_plan.h"
#include "platform/system_rules.h"
#include "posix/escaped_text.h"
#include "posix/service_log.h"
#include "posix/terminal.h"

namespace vela {

namespace {

constexpr char kGap[] = "  ";
constexpr char kEllipsis[] = "...";

std::string FormatCounts(const ProgressSummary& summary) {
  const auto [unit, count] = ChooseCount(summary);
  if (count.total <= 0) {
    return std::to_string(std::max(count.completed, 0)) + ' ' + unit;
  }
  return std::to_string(count.PartOf(100)) + "%  " + std::to_string(count.PartOf(count.total)) +
         " of " + std::to_string(count.total) + ' ' + unit;
}

bool IsContinuationByte(char byte) {
  return (static_cast<unsigned char>(byte) & 0xc0U) == 0x80U;
}

/// Returns the end of the text that fits into `width` columns: no character has more columns than
/// bytes. Empty when there is no room for more than a few characters.
std::string FitEnd(const std::string& text, int width) {
  constexpr int kLeastWidth = 8;
  const auto room = static_cast<size_t>(std::max(width, 0));
  if (text.size() <= room) {
    return text;
  }
  if (width < kLeastWidth) {
    return {};
  }
  size_t begin = text.size() - (room - (sizeof kEllipsis - 1));
  while (begin < text.size() && IsContinuationByte(text[begin])) {
    ++begin;
  }
  return kEllipsis + text.substr(begin);
}

}  // namespace

std::string FormatProgressLine(const ProgressSummary& summary, const std::string& directory,
                               int width) {
  const std::string counts = FormatCounts(summary);
  // The last column stays free: some terminals begin a new line after it.
  const int room = width - 1;
  const std::string path = FitEnd(EscapeControls(directory, InvalidBytes::kEscape),
                                  room - static_cast<int>(counts.size() + (sizeof kGap - 1)));
  return path.empty() ? counts.substr(0, static_cast<size_t>(std::max(room, 0)))
                      : counts + kGap + path;
}

std::string DirectoryInProgress(long pid) {
  const std::string folder = "/proc/" + std::to_string(pid) + "/fd";
  const std::string ending = std::string("/") + kMetadataDirName;
  std::error_code error;
  for (std::filesystem::directory_iterator file(folder, error), end; !error && file != end;
       file.increment(error)) {
    std::error_code unreadable;
    const std::string target = std::filesystem::read_symlink(file->path(), unreadable).string();
    if (target.size() > ending.size() &&
        target.compare(target.size() - ending.size(), ending.size(), ending) == 0) {
      return target.substr(0, target.size() - ending.size());
    }
  }
  return {};
}

ProgressLine::ProgressLine() : isShown_(IsErrorTerminal()) {}

ProgressLine::~ProgressLine() {
  Hide();
}

void ProgressLine::Update(long pid, const std::string& entry) const {
  if (!isShown_) {
    return;
  }
  std::string directory = DirectoryInProgress(pid);
  if (directory.empty()) {
    directory = TargetOf(entry).directory;
  }
  ShowStatusLine(FormatProgressLine(ReadProgressSummary(), directory, ErrorTerminalWidth()));
}

void ProgressLine::Hide() const {
  ShowStatusLine("");
}

}  // namespace vela
