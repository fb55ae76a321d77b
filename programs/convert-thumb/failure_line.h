// Tells why a run fails.
#pragma once

/// Writes one line to standard error: the program's name, then what `format` says, with spaces for
/// control characters. Only the first call of a run does: what fails later most likely fails for
/// the same reason. Any thread may call it.
[[gnu::format(printf, 1, 2)]] void TellFailure(const char* format, ...);
