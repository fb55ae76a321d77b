// The files through which a test and its stub tools communicate. The test creates them and the
// stubs only open them, so that a stub works under most faults that a test causes.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

constexpr const char* kStubDirectory = "/usr/vela/stub";
/// Call records, appended whole.
constexpr const char* kStubRecordFile = "/usr/vela/stub/record";
/// The counter that orders all events: an 8-byte number.
constexpr const char* kStubSequenceFile = "/usr/vela/stub/sequence";

/// Makes the directory with an empty record and the counter at 0; ends the process with a message
/// when it cannot.
void MakeStubDirectory();

/// The directory with the plans and the call counter of one tool.
std::string StubToolDirectory(const std::string& tool);

/// Adds 1 to the number in the file under an exclusive lock and returns the sum; 0 when the file
/// cannot be read and written.
uint64_t IncrementCounter(const std::string& file);

}  // namespace vela_test
