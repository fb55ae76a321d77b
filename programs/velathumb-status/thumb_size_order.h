// The size classes from the smallest to the largest; their values are in another order.
#pragma once

#include "storage/thumb_size_class.h"

inline constexpr EA_THUMB_SIZE kThumbSizesSmallestFirst[kEAThumbCount] = {
    EA_THUMB_SIZE_S, EA_THUMB_SIZE_SM, EA_THUMB_SIZE_M,
    EA_THUMB_SIZE_B, EA_THUMB_SIZE_L,  EA_THUMB_SIZE_XL};
