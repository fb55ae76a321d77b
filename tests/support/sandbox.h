// The sandbox every test program runs in: its own mount and process namespaces with private, empty
// and writable /tmp, /run (= /var/run), /var/spool, /usr/vela, /dev/shm and /etc/velainfo.conf. All
// the rest of the machine is visible and read-only; /usr/bin shows the machine's tools as symbolic
// links, so that a test can remove or replace single ones. Where it cannot be made, the program
// ends with status 1 and one line that says why.
#pragma once

#include <gtest/gtest.h>

#include <string>

namespace vela_test {

/// Enters the sandbox; called once, at the start of main, while the process has one thread. Returns
/// in a child process inside the sandbox (process 2 there, user id 0, working directory /); the
/// calling process itself waits for that child and ends with its exit status, 128 + n when signal n
/// ended it. `writableDirectory`, when not empty, is a directory of the machine that stays writable
/// from inside, at kWritablePlace.
void EnterSandbox(const std::string& writableDirectory = std::string());

/// Where the sandbox shows the writable directory given to EnterSandbox.
constexpr const char* kWritablePlace = "/.writable";

/// Brings all private places back to their first state: ends every other process of the sandbox,
/// unmounts what tests have mounted, removes what they have written, restores /usr/bin and /etc,
/// and clears the system log's record. The working directory becomes /. Does nothing in the child
/// of a death test, which works in its parent's places (use gtest's "fast" style: a restarted
/// program would not be in the sandbox).
void ResetSandbox();

/// The path under which the sandbox shows the machine's own `path` (absolute): also what lies in a
/// private place of the sandbox, such as a build directory under /tmp.
std::string HostPath(const std::string& path);

/// Fixture: every test starts with the private places in their first state and an empty log record.
class SandboxTest : public ::testing::Test {
 protected:
  void SetUp() override { ResetSandbox(); }
};

}  // namespace vela_test
