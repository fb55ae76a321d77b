// Does what the file of each question says instead of parsing it, confined like the real reader.

#include <csignal>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

#include "confinement.h"
#include "header/header_question.h"
#include "posix/file_content.h"
#include "posix/local_socket.h"

using namespace vela;

namespace {

/// More than the limit of the process.
constexpr size_t kMuchMemory = size_t{1} << 30;

void Send(const void* bytes, size_t size) {
  WriteAll(kQuestionSocket, {static_cast<const char*>(bytes), size});
}

HeaderAnswer AnswerWith(uint32_t width) {
  HeaderAnswer answer;
  answer.isRead = 1;
  answer.width = width;
  answer.height = 1;
  return answer;
}

void TakeMemory() {
  constexpr size_t kPiece = size_t{16} << 20;
  for (size_t taken = 0; taken < kMuchMemory; taken += kPiece) {
    void* const piece = std::malloc(kPiece);
    if (piece == nullptr) {
      _exit(1);
    }
    std::memset(piece, 1, kPiece);
  }
}

void Act(const std::string& command, uint32_t process) {
  HeaderAnswer answer = AnswerWith(process);
  if (command == "crash") {
    std::abort();
  } else if (command == "say nothing") {
    for (volatile bool isEndless = true; isEndless;) {
    }
  } else if (command == "say too little") {
    Send(&answer, 3);
    return;
  } else if (command == "say too much") {
    const std::string bytes(2 * sizeof answer, 'x');
    Send(bytes.data(), bytes.size());
    return;
  } else if (command == "send an unterminated text") {
    std::memset(answer.orientation, 'x', sizeof answer.orientation);
  } else if (command == "take memory") {
    TakeMemory();
  } else if (command == "end afterwards") {
    Send(&answer, sizeof answer);
    _exit(0);
  }
  Send(&answer, sizeof answer);
}

}  // namespace

int main() {
  const auto process = static_cast<uint32_t>(getpid());
  if (EnterConfinement() != 0) {
    return 1;
  }
  for (;;) {
    HeaderQuestion question;
    size_t got = 0;
    FileDescriptor file;
    if (ReceiveDescriptor(kQuestionSocket, reinterpret_cast<char*>(&question), sizeof question, got,
                          file) != 0 ||
        got == 0) {
      _exit(0);
    }
    Act(ReadAt(file.Get(), 0, 100), process);
  }
}
