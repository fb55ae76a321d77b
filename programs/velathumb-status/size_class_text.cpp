#include "size_class_text.h"

#include <functional>

#include "storage/thumb_size_class.h"

namespace vela {

namespace {

std::vector<std::string> Select(const std::function<bool(size_t)>& isWanted) {
  std::vector<std::string> names;
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    if (isWanted(static_cast<size_t>(size))) {
      names.emplace_back(kThumbSizeTraits[size].shortName);
    }
  }
  return names;
}

}  // namespace

const char* SizeClassName(const EAThumbInfo& row) {
  return kThumbSizeTraits[row.size].shortName;
}

std::vector<std::string> SizeClassesInState(const PhotoReport& photo, ThumbState state) {
  return Select([&](size_t size) { return photo.thumbs.states[size] == state; });
}

std::vector<std::string> FailedSizeClasses(const PhotoReport& photo) {
  return Select([&](size_t size) { return photo.failures[size].has_value(); });
}

}  // namespace vela
