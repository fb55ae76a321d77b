// Tells where a GIF's first frame lies, which libvips does not.
#pragma once

namespace vela {

/// Whether the first frame of the file under `descriptor` takes up the whole picture. False also
/// when that cannot be told. Leaves the place where the descriptor reads alone.
bool FirstFrameFillsGif(int descriptor);

}  // namespace vela
