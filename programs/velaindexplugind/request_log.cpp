#include "request_log.h"

#include <cstring>
#include <optional>

#include "log.h"
#include "posix/local_socket.h"

namespace vela {

namespace {

const char* NameOf(Outcome outcome) {
  switch (outcome) {
    case Outcome::kDone:
      return "done";
    case Outcome::kRefused:
      return "refused";
    case Outcome::kFailed:
      return "failed";
    case Outcome::kFault:
      break;
  }
  return "fault";
}

LogLevel LevelOf(const Answer& answer) {
  switch (answer.outcome) {
    case Outcome::kDone:
      return answer.error.empty() ? LogLevel::kInfo : LogLevel::kWarning;
    case Outcome::kRefused:
      return LogLevel::kWarning;
    case Outcome::kFailed:
      return LogLevel::kInfo;
    case Outcome::kFault:
      break;
  }
  return LogLevel::kError;
}

void AddPeer(LogLine& line, int socket) {
  const std::optional<ucred> peer = PeerOf(socket);
  if (peer) {
    line.Add("pid", peer->pid).Add("uid", peer->uid);
  }
}

}  // namespace

bool RequestLog::MayPass(const Answer& answer, int& suppressed) {
  if (logsAll_) {
    return true;
  }
  const bool isProblem = answer.outcome != Outcome::kDone || !answer.error.empty();
  return isProblem && problems_.Pass(Clock::now(), suppressed);
}

void RequestLog::Write(const Request* request, const Answer& answer, int socket,
                       Clock::time_point begin) {
  int suppressed = 0;
  if (!MayPass(answer, suppressed)) {
    return;
  }
  LogLine line(LevelOf(answer), "request");
  if (request != nullptr) {
    line.Add("command", CommandName(request->command));
  }
  if (request != nullptr && !request->path.empty()) {
    line.Add("path", request->path);
  }
  line.Add("outcome", NameOf(answer.outcome));
  if (!answer.error.empty()) {
    line.Add("error", answer.error);
  }
  AddPeer(line, socket);
  const auto took = std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - begin);
  line.Add("microseconds", took.count());
  if (suppressed > 0) {
    line.Add("suppressed", suppressed);
  }
  line.Write();
}

void RequestLog::WriteAcceptFailure(int error) {
  int suppressed = 0;
  if (!acceptFailures_.Pass(Clock::now(), suppressed)) {
    return;
  }
  LogLine(LogLevel::kError, "accept").Add("error", std::strerror(error)).Write();
}

}  // namespace vela
