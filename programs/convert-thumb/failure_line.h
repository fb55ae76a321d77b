// Tells why a run fails.
#pragma once

namespace vela {

/// Keeps one line for WriteFailureLine: what `format` says, with spaces for control characters.
/// Only the first call of a run does: what fails later most likely fails for the same reason. Any
/// thread may call it.
[[gnu::format(printf, 1, 2)]] void TellFailure(const char* format, ...);

/// Writes the program's name and the line that was kept, if one was, to standard error. Comes after
/// everything else that a failed run has to do, because nobody may be reading there.
void WriteFailureLine();

}  // namespace vela
