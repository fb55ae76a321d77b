// Takes from the process what it has no use for, before it looks at a photo.
#pragma once

#include "confinement/writable_places.h"

namespace vela {

/// From now on this process, and whatever program takes over, gains no privileges, leaves no memory
/// image behind, changes files only at `places`, and cannot make the system calls that
/// thumbnails do not need. Called while there is one thread. What the kernel cannot do is left out.
void Confine(const WritablePlaces& places);

/// No other program takes over any more, none can be started, by any thread: libraries may have
/// started some. After Confine.
void ConfineToThisProgram();

}  // namespace vela
