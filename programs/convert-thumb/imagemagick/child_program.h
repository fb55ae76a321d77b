// Runs another program in a child that this process stands for.
#pragma once

namespace vela {

/// Starts `program` with these arguments (closed by a null) and ends this process the way the child
/// ends: with its status or by its signal. SIGTERM, SIGINT, SIGHUP and SIGQUIT are passed on to it,
/// and it is killed when this process is. SIGCHLD is not ignored any more, in both. Returns only
/// when there is no child or its end cannot be known, with errno set.
void StandForProgram(const char* program, char* const* arguments);

}  // namespace vela
