#include "text_report.h"

#include <iomanip>
#include <ostream>
#include <vector>

#include "size_class_text.h"
#include "text_encoding.h"

namespace vela {

namespace {

constexpr int kColumnWidth = 9;

/// Appends "missing S, M" and the like; nothing without names.
void AppendNames(std::string& line, const char* what, const std::vector<std::string>& names) {
  const char* separator = " ";
  if (names.empty()) {
    return;
  }
  line += line.empty() ? "" : "; ";
  line += what;
  for (const std::string& name : names) {
    line += separator + name;
    separator = ", ";
  }
}

std::string DescribePhoto(const PhotoReport& photo) {
  std::string text;
  AppendNames(text, "missing", SizeClassesInState(photo, ThumbState::kMissing));
  AppendNames(text, "outdated", SizeClassesInState(photo, ThumbState::kOutdated));
  AppendNames(text, "failed", FailedSizeClasses(photo));
  return text;
}

void WriteCounts(std::ostream& out, const StatusCounts& counts, const std::string& queued) {
  for (const int64_t number : {counts.photos, counts.incompletePhotos, counts.presentThumbs,
                               counts.missingThumbs, counts.failureMarkers}) {
    out << std::setw(kColumnWidth) << number << ' ';
  }
  const std::string videos = counts.videos ? std::to_string(*counts.videos) : "-";
  out << std::setw(kColumnWidth) << videos << ' ' << std::setw(kColumnWidth) << queued << "  ";
}

std::string Plural(int64_t count, const char* one, const char* many) {
  return std::to_string(count) + ' ' + (count == 1 ? one : many);
}

}  // namespace

void TextReport::WriteHeading() {
  if (hasHeading_) {
    return;
  }
  hasHeading_ = true;
  for (const char* name : {"photos", "to do", "present", "missing", "failed", "videos", "queued"}) {
    out_ << std::setw(kColumnWidth) << name << ' ';
  }
  out_ << " directory\n";
}

void TextReport::TakePhoto(const PhotoReport& photo) {
  if (listPhotos_ && photo.thumbs.Missing() > 0) {
    photoLines_ += "    " + ToPlainLine(photo.Name()) + ": " + DescribePhoto(photo) + '\n';
  }
}

void TextReport::EndDirectory(const DirectoryReport& directory) {
  WriteHeading();
  WriteCounts(out_, directory.counts, directory.isQueued ? "yes" : "no");
  out_ << ToPlainLine(directory.path) << '\n' << photoLines_;
  photoLines_.clear();
}

void TextReport::TakeTotals(const StatusTotals& totals) {
  WriteHeading();
  WriteCounts(out_, totals.all, std::to_string(totals.queuedDirectories));
  out_ << "in " << Plural(totals.directories, "directory", "directories") << '\n';
}

}  // namespace vela
