#include "storage/photo_folder.h"

#include <string_view>
#include <vector>

#include "posix/directory_entries.h"
#include "posix/folder.h"

namespace vela {

namespace {

bool StartsWith(std::string_view name, std::string_view prefix) {
  return name.compare(0, prefix.size(), prefix) == 0;
}

bool EndsWith(std::string_view name, std::string_view suffix) {
  return name.size() >= suffix.size() &&
         name.compare(name.size() - suffix.size(), suffix.size(), suffix) == 0;
}

bool IsFailMarker(std::string_view name) {
  return name.front() != '.' && EndsWith(name, ".fail");
}

bool IsLeftover(std::string_view name) {
  return StartsWith(name, "VELAPHOTO.tmp.") || StartsWith(name, "magick-") ||
         (StartsWith(name, "Temp_") && EndsWith(name, ".jpg")) || name == "RAW_TEMP.ppm" ||
         name == "VELAPHOTO_THUMB_RAW.jpg";
}

/// The files of a folder that are to be removed.
struct Removals {
  std::vector<std::string> leftovers;
  std::vector<std::string> markers;
};

Removals FindRemovals(const std::string& path) {
  Removals removals;
  DirectoryEntries entries(path);
  while (const char* name = entries.IsOpen() ? entries.NextName() : nullptr) {
    if (IsLeftover(name)) {
      removals.leftovers.emplace_back(name);
    } else if (IsFailMarker(name)) {
      removals.markers.emplace_back(name);
    }
  }
  return removals;
}

bool RemoveAll(const std::string& path, const std::vector<std::string>& names) {
  bool areRemoved = true;
  for (const std::string& name : names) {
    areRemoved = RemoveEntry(path + "/" + name) == 0 && areRemoved;
  }
  return areRemoved;
}

}  // namespace

void RemoveLeftovers(const std::string& path) {
  RemoveAll(path, FindRemovals(path).leftovers);
}

bool CleanPhotoFolder(const std::string& path) {
  const Removals removals = FindRemovals(path);
  RemoveAll(path, removals.leftovers);
  return RemoveAll(path, removals.markers);
}

}  // namespace vela
