// Standard output as a terminal.
#pragma once

namespace vela {

/// Returns whether standard output is a terminal.
bool IsOutputTerminal();

/// Returns the number of columns of the terminal on standard output, 80 when it is unknown.
int TerminalWidth();

}  // namespace vela
