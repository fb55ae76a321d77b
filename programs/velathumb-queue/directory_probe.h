// Whether a directory is being worked on by somebody else.
#pragma once

#include "entry_plan.h"

namespace vela {

/// Returns whether another process holds the lock on a directory that the entry stands for:
/// velathumb would pass over it.
bool IsLockedElsewhere(const EntryTarget& target);

}  // namespace vela
