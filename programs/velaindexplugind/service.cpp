#include "service.h"

#include <sysexits.h>
#include <systemd/sd-daemon.h>

#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <exception>
#include <memory>
#include <optional>
#include <string>

#include "checks/configuration_check.h"
#include "event_source.h"
#include "index_store.h"
#include "index_writer.h"
#include "instance_lock.h"
#include "ipc/velamk_ipc.h"
#include "listening_socket.h"
#include "log.h"
#include "posix/accounts.h"
#include "posix/files.h"
#include "posix/processes.h"
#include "request_handler.h"
#include "request_log.h"
#include "server.h"
#include "settings.h"
#include "start_problem.h"

namespace vela {

namespace {

constexpr int kStarted = 0;
constexpr int kNotStarted = 1;
/// Not without an administrator: systemd need not start the daemon again.
constexpr int kMisconfigured = EX_CONFIG;

/// The age at which a request that waits to write to the index fails.
constexpr std::chrono::milliseconds kWriteTimeout(5000);

/// How long the daemon waits for pending requests when it stops.
constexpr uint64_t kStopTime = 5000000;  // microseconds

/// Descriptors for everything but clients: those of the event loop, and for each worker those of an
/// index connection and a media file.
constexpr uint64_t kOwnDescriptors = 48;
constexpr uint64_t kWorkerDescriptors = 4;

/// Raises the limit of open files to what `wanted` clients need, as far as permitted. Returns how
/// many clients the limit allows.
size_t AllowClients(int wanted, int workers) {
  const uint64_t own = kOwnDescriptors + static_cast<uint64_t>(workers) * kWorkerDescriptors;
  const uint64_t needed = static_cast<uint64_t>(wanted) + own;
  const uint64_t limit = RaiseOpenFileLimit(needed);
  if (limit >= needed) {
    return static_cast<size_t>(wanted);
  }
  return static_cast<size_t>(limit > own ? limit - own : 1);
}

void NotifyReloading() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  const long long microseconds = now.tv_sec * 1000000LL + now.tv_nsec / 1000;
  sd_notifyf(0, "RELOADING=1\nMONOTONIC_USEC=%lld", microseconds);
}

void LogGroupFailure(const std::string& path, gid_t group, int error) {
  LogLine(LogLevel::kWarning, "database")
      .Add("path", path)
      .Add("gid", group)
      .Add("error", std::strerror(error))
      .Add("advice", "a service without CAP_CHOWN needs Group= in its unit")
      .Write();
}

void LogSocketGroup(const std::string& path, gid_t group) {
  LogLine(LogLevel::kWarning, "socket")
      .Add("path", path)
      .Add("gid", group)
      .Add("error", "it keeps the group that the service manager has given it")
      .Add("advice", "set SocketGroup= in its unit")
      .Write();
}

class Service {
 public:
  explicit Service(const Options& options) : options_(options), log_(options.logRequests) {}

  StartProblem Start();

  /// Serves requests until a signal stops the daemon.
  void Run();

 private:
  static int OnEndSignal(sd_event_source* source, const signalfd_siginfo* info, void* service);
  static int OnReloadSignal(sd_event_source* source, const signalfd_siginfo* info, void* service);
  static int OnStopTime(sd_event_source* source, uint64_t time, void* service);

  StartProblem FindOptionsGroup();
  StartProblem OpenIndex();
  StartProblem OpenSocket();
  StartProblem StartServer();
  int WatchSignals();
  void LoadSettings(const char* event);
  void BeginStop(const char* signalName);
  void EndLoop() { sd_event_exit(loop_.get(), 0); }

  const Options& options_;
  std::optional<gid_t> group_;
  FileDescriptor lock_;
  ListeningSocket socket_;
  std::unique_ptr<IndexStore> index_;
  std::unique_ptr<RequestHandler> handler_;
  std::unique_ptr<IndexWriter> writer_;
  RequestLog log_;
  EventLoop loop_;
  std::unique_ptr<Server> server_;
  bool isStopping_ = false;
};

StartProblem Service::FindOptionsGroup() {
  if (options_.group.empty()) {
    return {};
  }
  group_ = FindGroup(options_.group);
  if (group_) {
    return {};
  }
  const int error = errno;
  return error == 0 ? StartProblem{"there is no group " + options_.group, true}
                    : StartProblem{"cannot look up the group " + options_.group + ": " +
                                   std::strerror(error)};
}

StartProblem Service::OpenIndex() {
  const IndexFile file = {options_.database, group_, true, LogGroupFailure};
  const std::optional<FileStatus> status = ExamineFile(file.path);
  if (status && !status->isRegular) {
    return {file.path + " is not a file", true};
  }
  StartProblem problem = LockIndex(file, lock_);
  if (!problem.IsNone()) {
    return problem;
  }
  index_ = std::make_unique<IndexStore>(file);
  handler_ = std::make_unique<RequestHandler>(*index_);
  writer_ = std::make_unique<IndexWriter>(*index_, kWriteTimeout);
  const IndexResult opened = index_->Open();
  return opened.IsOk() ? StartProblem()
                       : StartProblem{file.path + ": " + opened.message, opened.IsUnusable()};
}

StartProblem Service::OpenSocket() {
  bool isTaken = false;
  StartProblem problem = socket_.TakeFromManager(isTaken);
  if (isTaken && group_ && socket_.HasOtherGroup(*group_)) {
    LogSocketGroup(socket_.Address(), *group_);
  }
  if (!problem.IsNone() || isTaken) {
    return problem;
  }
  return socket_.Make(PluginDaemonSocketPath, group_);
}

void LogFaultsOfSettings(const char* event) {
  for (const Finding& finding : FindingsForLog(CheckSettings())) {
    LogLine line(LevelOf(finding.severity), event);
    line.Add("file", finding.file);
    if (finding.line != 0) {
      line.Add("line", finding.line);
    }
    line.Add("problem", finding.message).Write();
  }
}

void Service::LoadSettings(const char* event) {
  const Settings settings = ReadSettings();
  server_->SetSettings(settings);
  LogFaultsOfSettings(event);
  LogLine(LogLevel::kInfo, event)
      .Add("index_version", settings.indexVersion)
      .Add("disable_convert_photo", settings.isPhotoConvertDisabled ? "yes" : "no")
      .Add("disable_convert_video", settings.isVideoConvertDisabled ? "yes" : "no")
      .Write();
}

int Service::OnEndSignal(sd_event_source* /*source*/, const signalfd_siginfo* info, void* service) {
  const bool isInterrupt = info->ssi_signo == static_cast<uint32_t>(SIGINT);
  static_cast<Service*>(service)->BeginStop(isInterrupt ? "SIGINT" : "SIGTERM");
  return 0;
}

int Service::OnReloadSignal(sd_event_source* /*source*/, const signalfd_siginfo* /*info*/,
                            void* service) {
  try {
    NotifyReloading();
    static_cast<Service*>(service)->LoadSettings("settings");
  } catch (const std::exception&) {
    return 0;  // keeps the previous settings
  }
  sd_notify(0, "READY=1");
  return 0;
}

int Service::OnStopTime(sd_event_source* /*source*/, uint64_t /*time*/, void* service) {
  static_cast<Service*>(service)->EndLoop();
  return 0;
}

int Service::WatchSignals() {
  int result = sd_event_add_signal(loop_.get(), nullptr, SIGTERM, OnEndSignal, this);
  if (result >= 0) {
    result = sd_event_add_signal(loop_.get(), nullptr, SIGINT, OnEndSignal, this);
  }
  if (result >= 0) {
    result = sd_event_add_signal(loop_.get(), nullptr, SIGHUP, OnReloadSignal, this);
  }
  return result;
}

StartProblem Service::StartServer() {
  sd_event* loop = nullptr;
  int result = sd_event_new(&loop);
  loop_.reset(loop);
  if (result >= 0) {
    result = WatchSignals();
  }
  if (result < 0) {
    return ProblemAt("event loop", -result);
  }
  ServerLimits limits;
  limits.workers = options_.workers;
  limits.clients = AllowClients(options_.maxClients, options_.workers);
  limits.clientTimeout = std::chrono::seconds(options_.clientTimeout);
  server_ = std::make_unique<Server>(loop, limits, *handler_, *writer_, log_);
  const int error = server_->Start(socket_.Fd());
  return error == 0 ? StartProblem() : ProblemAt("event loop", error);
}

StartProblem Service::Start() {
  StartProblem problem = FindOptionsGroup();
  if (problem.IsNone()) {
    problem = OpenIndex();
  }
  if (problem.IsNone()) {
    problem = OpenSocket();
  }
  if (problem.IsNone()) {
    problem = StartServer();
  }
  if (!problem.IsNone()) {
    return problem;
  }
  LogLine(LogLevel::kInfo, "start")
      .Add("version", VELA_VERSION)
      .Add("socket", socket_.Address())
      .Add("database", options_.database)
      .Add("workers", options_.workers)
      .Write();
  LoadSettings("settings");
  sd_notify(0, "READY=1");
  return {};
}

void Service::BeginStop(const char* signalName) {
  // The second signal ends the wait for pending requests.
  if (isStopping_) {
    return EndLoop();
  }
  isStopping_ = true;
  sd_notify(0, "STOPPING=1");
  // New clients must fail at once when the socket is the daemon's own. In the service manager's
  // socket they wait for the next daemon.
  const bool isOwnSocket = socket_.Unlink();
  const int result = sd_event_add_time_relative(loop_.get(), nullptr, CLOCK_MONOTONIC, kStopTime, 0,
                                                OnStopTime, this);
  if (result < 0) {
    EndLoop();
  }
  try {
    LogLine(LogLevel::kInfo, "stop").Add("signal", signalName).Write();
    server_->BeginStop(isOwnSocket, [this] { EndLoop(); });
    socket_.Close();
  } catch (const std::exception&) {
    EndLoop();
  }
}

void Service::Run() {
  const int result = sd_event_loop(loop_.get());
  if (result < 0) {
    LogLine(LogLevel::kError, "loop").Add("error", std::strerror(-result)).Write();
  }
  const size_t pending = server_->PendingJobs();
  if (pending > 0) {
    LogLine(LogLevel::kWarning, "stop").Add("requests_left", static_cast<int64_t>(pending)).Write();
    socket_.Unlink();
    // Their threads may be waiting for a disk that does not respond, so they cannot be joined.
    std::_Exit(kStarted);
  }
}

}  // namespace

int RunService(const Options& options) {
  StartProblem problem;
  try {
    // The event loop receives these; threads started later inherit the block.
    BlockSignals({SIGTERM, SIGINT, SIGHUP});
    IgnoreBrokenPipes();
    Service service(options);
    problem = service.Start();
    if (problem.IsNone()) {
      service.Run();
      return kStarted;
    }
  } catch (const std::exception& error) {
    problem = {error.what()};
  }
  LogLine(LogLevel::kError, "start").Add("error", problem.text).Write();
  return problem.isPermanent ? kMisconfigured : kNotStarted;
}

}  // namespace vela
