// The fixed size classes of thumbnails, their file names and the size map.
#pragma once

#include <cstdint>
#include <string_view>

#include "platform/system_rules.h"

/// Size classes. The values are bit positions in the size map and therefore out of size order.
enum EA_THUMB_SIZE : int32_t {
  EA_THUMB_SIZE_S = 0,
  EA_THUMB_SIZE_M = 1,
  EA_THUMB_SIZE_B = 2,
  EA_THUMB_SIZE_L = 3,
  EA_THUMB_SIZE_XL = 4,
  EA_THUMB_SIZE_SM = 5,
};

/// One size class.
struct EAThumbInfo {
  int32_t size;            ///< an EA_THUMB_SIZE
  const char* sizeString;  ///< width, the letter x, height
  const char* name;        ///< file name of the thumbnail
  const char* oldName;     ///< its older form, with a colon
};

/// The size classes by value.
extern const EAThumbInfo rgEAThumbInfo[vela::kThumbSizeCount];

namespace vela {

/// What distinguishes a size class beyond its row in rgEAThumbInfo.
struct ThumbSizeTraits {
  EA_THUMB_SIZE size;
  const char* shortName;  ///< as reports show it
  int edge;               ///< edge length of the box in pixels
  bool fillsArea;         ///< the thumbnail fills its box; otherwise it fits into it
};

/// The traits of the size classes by value.
inline constexpr ThumbSizeTraits kThumbSizeTraits[kThumbSizeCount] = {
    {EA_THUMB_SIZE_S, "S", 120, false},   {EA_THUMB_SIZE_M, "M", 320, true},
    {EA_THUMB_SIZE_B, "B", 640, false},   {EA_THUMB_SIZE_L, "L", 800, true},
    {EA_THUMB_SIZE_XL, "XL", 1280, true}, {EA_THUMB_SIZE_SM, "SM", 240, true},
};

/// The size classes from the smallest to the largest; their values are in another order.
inline constexpr EA_THUMB_SIZE kThumbSizesSmallestFirst[kThumbSizeCount] = {
    EA_THUMB_SIZE_S, EA_THUMB_SIZE_SM, EA_THUMB_SIZE_M,
    EA_THUMB_SIZE_B, EA_THUMB_SIZE_L,  EA_THUMB_SIZE_XL};

/// Returns the size class of the thumbnail file name `name` (either form), null when it belongs to
/// none.
const ThumbSizeTraits* FindThumbSize(std::string_view name);

}  // namespace vela

/// Stores a pointer to rgEAThumbInfo in `out` and returns its row count, 6.
int GetEAThumbInfoTable(const EAThumbInfo** out);

/// Returns the size string of the class `value` (0 to 5; there is no upper bound check), or null
/// for a negative value, which is logged.
const char* GetEAThumbSizeString(int value);

/// Returns 1 when the class of the thumbnail file name `name` (either form) is set in `sizeMap`,
/// else 0; a name that belongs to no class is logged.
int IsThumbInSizeMap(const char* name, int32_t sizeMap);
