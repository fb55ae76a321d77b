// Keeps the process from changing files, through the kernel's Landlock.
#pragma once

#include "confinement/writable_places.h"

namespace vela {

/// From now on this thread, and all that it starts, can write, create, truncate and remove regular
/// files only at `places`; it can make nothing else, not reach the network by TCP, and not send
/// signals to processes started earlier. What the kernel does not know of this is left out. Places
/// that do not exist are passed over. Descriptors that are open already stay as they are. Needs
/// that the process cannot gain privileges any more.
void AllowWritingOnlyAt(const WritablePlaces& places);

}  // namespace vela
