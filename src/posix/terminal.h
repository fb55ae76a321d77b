// Standard output and standard error as terminals.
#pragma once

namespace vela {

/// Returns whether standard output is a terminal.
bool IsOutputTerminal();

/// Returns the number of columns of the terminal on standard output, 80 when it is unknown.
int TerminalWidth();

/// Returns whether standard error is a terminal on which a line can be replaced.
bool IsErrorTerminal();

/// Returns the number of columns of the terminal on standard error, 80 when it is unknown.
int ErrorTerminalWidth();

}  // namespace vela
