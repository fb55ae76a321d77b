#include "storage/thumb_size_class.h"

#include <iterator>

#include "posix/log.h"
#include "storage/log_source.h"

using namespace vela;

constexpr EAThumbInfo rgEAThumbInfo[kThumbSizeCount] = {
    {EA_THUMB_SIZE_S, "120x120", "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO:THUMB_S.jpg"},
    {EA_THUMB_SIZE_M, "320x320", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO:THUMB_M.jpg"},
    {EA_THUMB_SIZE_B, "640x640", "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO:THUMB_B.jpg"},
    {EA_THUMB_SIZE_L, "800x800", "VELAPHOTO_THUMB_L.jpg", "VELAPHOTO:THUMB_L.jpg"},
    {EA_THUMB_SIZE_XL, "1280x1280", "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO:THUMB_XL.jpg"},
    {EA_THUMB_SIZE_SM, "240x240", "VELAPHOTO_THUMB_SM.jpg", "VELAPHOTO:THUMB_SM.jpg"},
};

namespace {

constexpr bool IsIndexedBySize() {
  for (int i = 0; i < kThumbSizeCount; ++i) {
    if (rgEAThumbInfo[i].size != i || kThumbSizeTraits[i].size != i) {
      return false;
    }
  }
  return true;
}
static_assert(IsIndexedBySize(), "a row's position is its size class");

/// Returns true when `sizeString` is a square box of this edge length.
constexpr bool IsSquareOf(int edge, std::string_view sizeString) {
  const std::string_view width = sizeString.substr(0, sizeString.find('x'));
  int number = 0;
  for (const char digit : width) {
    number = number * 10 + (digit - '0');
  }
  return number == edge && sizeString.substr(width.size() + 1) == width;
}

constexpr bool HaveEqualSizes() {
  for (int i = 0; i < kThumbSizeCount; ++i) {
    if (!IsSquareOf(kThumbSizeTraits[i].edge, rgEAThumbInfo[i].sizeString)) {
      return false;
    }
  }
  return true;
}
static_assert(HaveEqualSizes(), "both tables have the same sizes");

constexpr bool IsSmallestFirst() {
  for (int i = 1; i < kThumbSizeCount; ++i) {
    if (kThumbSizeTraits[kThumbSizesSmallestFirst[i - 1]].edge >=
        kThumbSizeTraits[kThumbSizesSmallestFirst[i]].edge) {
      return false;
    }
  }
  return true;
}
static_assert(IsSmallestFirst(), "the order is by size and names each size class once");

}  // namespace

namespace vela {

const ThumbSizeTraits* FindThumbSize(std::string_view name) {
  for (const EAThumbInfo& row : rgEAThumbInfo) {
    if (name == row.name || name == row.oldName) {
      return &kThumbSizeTraits[row.size];
    }
  }
  return nullptr;
}

}  // namespace vela

int GetEAThumbInfoTable(const EAThumbInfo** out) {
  *out = rgEAThumbInfo;
  return static_cast<int>(std::size(rgEAThumbInfo));
}

const char* GetEAThumbSizeString(int value) {
  if (value < 0) {
    LogError(kMetadataLogSource, 47, "Bad parameters.");
    return nullptr;
  }
  return rgEAThumbInfo[value].sizeString;
}

int IsThumbInSizeMap(const char* name, int32_t sizeMap) {
  const ThumbSizeTraits* traits = name == nullptr ? nullptr : FindThumbSize(name);
  if (traits == nullptr) {
    LogError(kMetadataLogSource, 113, "[Error] invalid thumb filename: " + LogText(name));
    return 0;
  }
  return (sizeMap & (1 << traits->size)) != 0 ? 1 : 0;
}
