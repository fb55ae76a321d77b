#include "request_log.h"

#include <cstring>
#include <optional>

#include "log.h"
#include "peer.h"

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
  if (peer) line.Add("pid", peer->pid).Add("uid", peer->uid);
}

}  // namespace

bool RequestLog::MayPass(const Answer& answer, int& heldBack) {
  if (logsAll_) return true;
  const bool isProblem = answer.outcome != Outcome::kDone || !answer.error.empty();
  return isProblem && problems_.Pass(Clock::now(), heldBack);
}

void RequestLog::Write(const Request* request, const Answer& answer, int socket,
                       Clock::time_point begin) {
  int heldBack = 0;
  if (!MayPass(answer, heldBack)) return;
  LogLine line(LevelOf(answer), "request");
  if (request != nullptr) line.Add("command", CommandWord(request->command));
  if (request != nullptr && !request->path.empty()) line.Add("path", request->path);
  line.Add("outcome", NameOf(answer.outcome));
  if (!answer.error.empty()) line.Add("error", answer.error);
  AddPeer(line, socket);
  const auto took = std::chrono::duration_cast<std::chrono::microseconds>(Clock::now() - begin);
  line.Add("microseconds", took.count());
  if (heldBack > 0) line.Add("lines_held_back", heldBack);
  line.Write();
}

void RequestLog::WriteAcceptFailure(int error) {
  int heldBack = 0;
  if (!acceptFailures_.Pass(Clock::now(), heldBack)) return;
  LogLine(LogLevel::kError, "accept").Add("error", std::strerror(error)).Write();
}

}  // namespace vela
