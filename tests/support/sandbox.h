// The sandbox in which every test program runs: its own mount and process namespaces with private,
// empty and writable /tmp, /run (= /var/run), /var/spool, /usr/vela, /dev/shm and
// /etc/velainfo.conf. The rest of the machine is visible and read-only; /usr/bin shows the
// machine's tools as symbolic links, so that a test can remove or replace single ones. If it cannot
// be created, the program ends with status 1 and one line with the reason.
#pragma once

#include <gtest/gtest.h>

#include <string>

namespace vela_test {

/// Enters the sandbox; called once, at the start of main, while the process has one thread. Returns
/// in a child process inside the sandbox (process 2 there, user id 0, working directory /); the
/// calling process itself waits for that child and ends with its exit status, 128 + n when signal n
/// ended it. `writableDirectory`, when not empty, is a directory of the machine, absolute or
/// relative to the working directory, that stays writable from inside, at kWritablePlace.
void EnterSandbox(const std::string& writableDirectory = std::string());

/// The path of the writable directory given to EnterSandbox inside the sandbox.
constexpr const char* kWritablePlace = "/.writable";

/// Restores all private directories to their first state: ends every other process of the sandbox,
/// unmounts what tests have mounted, removes what they have written, restores /usr/bin and /etc,
/// and clears the system log's record. The working directory becomes /. Does nothing in the child
/// of a death test, which uses its parent's sandbox (use gtest's "fast" style: a restarted program
/// would not be in the sandbox).
void ResetSandbox();

/// The path of the machine's own `path` (absolute) inside the sandbox, also when a private
/// directory hides it, such as a build directory under /tmp.
std::string HostPath(const std::string& path);

/// The path, inside the sandbox, of the file that the build makes at `path` (absolute, below the
/// build directory). Every user can reach it, wherever the clone is.
std::string BuiltPath(const std::string& path);

/// The top folder of the source tree inside the sandbox, reachable for every user.
constexpr const char* kSourcePlace = "/.source";

/// Fixture: every test starts with the private places in their first state and an empty log record.
class SandboxTest : public ::testing::Test {
 protected:
  void SetUp() override { ResetSandbox(); }
};

}  // namespace vela_test
