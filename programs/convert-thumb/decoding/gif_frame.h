// The position of the first frame of a GIF, which libvips does not report.
#pragma once

namespace vela {

/// Returns true when the first frame of the file covers the whole picture, false also when that
/// cannot be determined. Does not change the descriptor's position.
bool FirstFrameCoversGif(int descriptor);

}  // namespace vela
