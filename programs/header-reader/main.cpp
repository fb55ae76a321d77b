// header-reader
//
// Answers questions about image files whose descriptors it gets through its standard output, a
// socket. It is started by other programs, not by users.

#include <chrono>
#include <ctime>

#include "answer.h"
#include "confinement.h"
#include "header/header_question.h"
#include "image_size.h"
#include "posix/file_content.h"
#include "posix/local_socket.h"

using namespace vela;

namespace {

/// It ends after so many questions or so much processor time, far below its limits, so that neither
/// leaks nor the time of harmless files make it fail.
constexpr int kMaxQuestions = 1000;
constexpr std::clock_t kMaxProcessorTime = std::clock_t{2} * CLOCKS_PER_SEC;

/// A program that is observed for its progress does not appear to be waiting for this process.
constexpr std::chrono::seconds kMaxIdleTime(60);

/// Returns false when there are no more questions.
bool AnswerQuestion() {
  HeaderQuestion question;
  size_t got = 0;
  FileDescriptor file;
  const int error = ReceiveDescriptor(kQuestionSocket, reinterpret_cast<char*>(&question),
                                      sizeof question, got, file);
  if (error != 0 || got != sizeof question || !file.IsOpen()) {
    return false;
  }
  const HeaderAnswer answer = Answer(question, file);
  file.Reset();
  return WriteAll(kQuestionSocket, {reinterpret_cast<const char*>(&answer), sizeof answer}) == 0;
}

}  // namespace

int main() {
  InitializeImageLibrary();
  if (LimitReceiving(kQuestionSocket, kMaxIdleTime) != 0 || EnterConfinement() != 0) {
    return 1;
  }
  for (int i = 0; i < kMaxQuestions && std::clock() < kMaxProcessorTime; ++i) {
    if (!AnswerQuestion()) {
      break;
    }
  }
  // The libraries' clean-up is of no use here.
  _exit(0);
}
