#include "storage/thumb_size_class.h"

#include <syslog.h>

#include <cstring>

#include "storage/log_source.h"

using vela::kEAThumbCount;
using vela::kMetadataLogSource;
using vela::kThumbSizesSmallestFirst;

constexpr EAThumbInfo rgEAThumbInfo[kEAThumbCount] = {
    {EA_THUMB_SIZE_S, "120x120", "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO:THUMB_S.jpg"},
    {EA_THUMB_SIZE_M, "320x320", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO:THUMB_M.jpg"},
    {EA_THUMB_SIZE_B, "640x640", "VELAPHOTO_THUMB_B.jpg", "VELAPHOTO:THUMB_B.jpg"},
    {EA_THUMB_SIZE_L, "800x800", "VELAPHOTO_THUMB_L.jpg", "VELAPHOTO:THUMB_L.jpg"},
    {EA_THUMB_SIZE_XL, "1280x1280", "VELAPHOTO_THUMB_XL.jpg", "VELAPHOTO:THUMB_XL.jpg"},
    {EA_THUMB_SIZE_SM, "240x240", "VELAPHOTO_THUMB_SM.jpg", "VELAPHOTO:THUMB_SM.jpg"},
};

namespace {

bool IsNameOf(const EAThumbInfo& row, const char* name) {
  return std::strcmp(name, row.name) == 0 || std::strcmp(name, row.oldName) == 0;
}

constexpr bool IsIndexedBySize() {
  for (int i = 0; i < kEAThumbCount; ++i) {
    if (rgEAThumbInfo[i].size != i) {
      return false;
    }
  }
  return true;
}
static_assert(IsIndexedBySize(), "a row's position is its size class");

}  // namespace

int GetEAThumbInfoTable(const EAThumbInfo** out) {
  *out = rgEAThumbInfo;
  return kEAThumbCount;
}

const char* GetEAThumbSizeString(int value) {
  if (value < 0) {
    syslog(LOG_ERR, "%s:%d Bad parameters.", kMetadataLogSource, 47);
    return nullptr;
  }
  return rgEAThumbInfo[value].sizeString;
}

int IsThumbInSizeMap(const char* name, int32_t sizeMap) {
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    if (IsNameOf(rgEAThumbInfo[size], name)) {
      return (sizeMap & (1 << size)) != 0 ? 1 : 0;
    }
  }
  syslog(LOG_ERR, "%s:%d [Error] invalid thumb filename: %s", kMetadataLogSource, 113, name);
  return 0;
}
