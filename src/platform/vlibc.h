// Core C library of the platform: key/value files, line search, file status and times, piped child
// processes, sending signals to processes by name, free space, and the error of the last failure.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>

extern "C" {

/// One point in time.
struct VLIBCTime {
  int64_t seconds;      ///< since the epoch
  int64_t nanoseconds;  ///< 0 to 999,999,999
};

/// The status of a file.
struct VLIBCFileStatus {
  uint32_t mode;           ///< type and permission bits, as in st_mode
  int64_t size;            ///< bytes
  int64_t blocks;          ///< allocated blocks of 512 bytes
  VLIBCTime access;        ///< last access
  VLIBCTime modification;  ///< last change of the content
  VLIBCTime change;        ///< last change of the content or the status
};

/// The three times that VLIBCFileUTime takes, in this order.
struct VLIBCFileTimes {
  VLIBCTime access;
  VLIBCTime modification;
  VLIBCTime change;
};

/// Copies the value of `key` in the key/value file `file` into `out` (at most `outSize` bytes,
/// always terminated; a longer value is truncated). `flags` is 0. Returns 1 when the key was found
/// (also with an empty value), 0 when it is absent, -1 when the file cannot be read.
int VLIBCFileGetKeyValue(const char* file, const char* key, char* out, size_t outSize, int flags);

/// Sets `key` to `value` in the key/value file `file`, which is created when missing; readers see
/// the old file or the new one. `flags` is 0. Returns 0, or -1 (unwritable file, or a key or value
/// that does not fit on one line).
int VLIBCFileSetKeyValue(const char* file, const char* key, const char* value, int flags);

/// Returns 1 when `key` is in the key/value file `file` with exactly `value`, else 0. `flags` is 0.
int VLIBCFileCheckKeyValue(const char* file, const char* key, const char* value, int flags);

/// Looks in `file` for the first line equal to `text` and copies it without its newline into `out`
/// (at most `outSize` bytes, always terminated). Returns the line's length in bytes, 0 when there
/// is none, -1 when the file cannot be read.
int VLIBCFileGetLine(const char* file, const char* text, char* out, size_t outSize, int flags);

/// Fills `out` with the status of `path`, symbolic links followed. Returns 0, or -1.
int VLIBCFileStat(const char* path, int options, VLIBCFileStatus* out);

/// Sets the times of `path` that `options` selects (bit 1 access, bit 2 modification), symbolic
/// links followed. Returns 0, or -1.
int VLIBCFileUTime(const char* path, int options, const VLIBCFileTimes* times);

/// Starts `program` directly (no shell) with the arguments that follow `mode`, ended by a null
/// pointer, and returns a stream of its standard output; with `E` in `mode` its standard error is
/// included. Returns null when the program cannot be started.
FILE* VLIBCPopen(const char* program, const char* mode, ...) __attribute__((sentinel));

/// Closes a stream of VLIBCPopen, waits for its child and returns the child's exit status, or -1
/// when the child was ended by a signal or the stream was not opened by VLIBCPopen.
int VLIBCPclose(FILE* stream);

/// Sends `signal` (SIGTERM when 0) to every running process whose command name is `name`, except
/// the caller. Async-signal-safe. Returns the number of processes signalled, or -1 when the process
/// table cannot be read.
int VLIBCKill(const char* name, int signal);

/// Returns the bytes available to an ordinary user on the volume that holds `path`, 0 when it
/// cannot be determined.
uint64_t VLIBGetFsAvailSize(const char* path);

/// Returns the code (an errno value) of the calling thread's last platform failure, 0 without one.
int VLIBCErrGet(void);

/// Returns the source file of the calling thread's last platform failure, "" without one.
const char* VLIBCErrorGetFile(void);

/// Returns the source line of the calling thread's last platform failure, 0 without one.
int VLIBCErrorGetLine(void);

}  // extern "C"
