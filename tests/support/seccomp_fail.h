// Makes system calls of a child process fail, for faults that files cannot cause.
#pragma once

#include <cstdint>
#include <vector>

#include "support/program.h"

namespace vela_test {

/// A system call to refuse.
struct RefusedCall {
  int number;         ///< SYS_...
  int error;          ///< the errno that it returns
  int argument = -1;  ///< argument (0 to 5) to examine, -1: refuse every call
  uint32_t mask = 0;  ///< with `argument`: refuse when (argument & mask) == value; low 32 bits
  uint32_t value = 0;
};

/// The calls fail in the program, including its dynamic loader, and in everything that it starts:
/// so opening files can only be refused under a condition on its flags (OpenForWriting...).
BeforeExec SeccompFail(const std::vector<RefusedCall>& calls);

/// Every one of `numbers` fails with `error`.
BeforeExec SeccompFail(const std::vector<int>& numbers, int error);

/// All system calls behind one library function, for SeccompFail.
std::vector<int> ChmodCalls();
std::vector<int> RenameCalls();
std::vector<int> MkdirCalls();
std::vector<int> FlockCalls();
std::vector<int> ForkCalls();

/// Opens whose flags contain all of `flags`, such as O_CREAT or O_DIRECTORY.
std::vector<RefusedCall> OpensWithFlags(int flags, int error);

}  // namespace vela_test
