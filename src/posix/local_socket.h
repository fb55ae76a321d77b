// Stream sockets of the local machine (AF_UNIX). Paths are those of the sockets in the file system;
// functions that return an int return 0 or an errno value.
#pragma once

#include <sys/socket.h>

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "posix/deadline.h"
#include "posix/file_descriptor.h"

namespace vela {

/// Creates a non-blocking socket. On failure, the descriptor is not open and errno is set.
FileDescriptor MakeLocalSocket();

/// Returns whether a socket address can hold the path.
bool FitsLocalAddress(std::string_view path);

/// Connects without waiting. Returns EAGAIN when the listener's queue is full.
int ConnectNow(int socket, std::string_view path);

/// Creates a socket and connects it to a listener of root or of this process's user, waiting until
/// the deadline when the listener's queue is full. Creates no socket when nothing exists at the
/// path. Returns ETIMEDOUT when the queue stays full, ECONNREFUSED when nothing listens, when
/// something other than a socket is at the path, and when the socket, the process behind it or a
/// symbolic link to it is another user's.
int OpenConnection(const char* path, const Deadline& deadline, FileDescriptor& connection);

/// Binds the socket to the path.
int BindLocal(int socket, std::string_view path);

/// Accepts a connection of a listening socket; it is non-blocking as well. On failure, the
/// descriptor is not open and errno is set.
FileDescriptor AcceptLocal(int listener);

/// Sends as much as possible without waiting; `sent` receives the number of bytes. Returns EAGAIN
/// when nothing could be sent.
int SendNow(int socket, std::string_view bytes, size_t& sent);

/// Sends all bytes. Returns ETIMEDOUT when that is not possible before the deadline.
int SendAll(int socket, std::string_view bytes, const Deadline& deadline);

/// Receives what has arrived; `got` is 0 at the end of the connection. Returns EAGAIN when nothing
/// has arrived.
int ReceiveNow(int socket, char* buffer, size_t size, size_t& got);

/// The same, but waits until something arrives. Returns ETIMEDOUT when nothing does before the
/// deadline.
int ReceiveSome(int socket, char* buffer, size_t size, const Deadline& deadline, size_t& got);

/// Two connected sockets for messages; the other end receives each as a whole.
struct MessageSockets {
  FileDescriptor own;
  FileDescriptor other;
};

/// Connects two new sockets. On failure, neither is open and errno is set.
MessageSockets ConnectMessageSockets();

/// Sends a message with a copy of the descriptor `fd`, without waiting.
int SendDescriptor(int socket, std::string_view message, int fd);

/// Limits how long a blocking receive on this socket waits; it then returns EAGAIN.
int LimitReceiving(int socket, std::chrono::seconds limit);

/// Waits for a message; `got` is 0 at the end of the connection. `fd` is open only if a descriptor
/// came with the message.
int ReceiveDescriptor(int socket, char* buffer, size_t size, size_t& got, FileDescriptor& fd);

/// Signals the end of the data to the other end, which can still send.
void EndSending(int socket);

/// Returns the process that opened the other end of the connection, nothing when it is unknown.
std::optional<ucred> PeerOf(int socket);

/// Returns the path of a bound socket, with '@' in front of a name in the abstract namespace; empty
/// when it is unknown.
std::string LocalAddressOf(int socket);

}  // namespace vela
