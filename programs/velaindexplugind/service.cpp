#include "service.h"

#include <sys/resource.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <time.h>
#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstring>
#include <exception>
#include <memory>
#include <optional>
#include <string>

#include "event_source.h"
#include "group.h"
#include "index_store.h"
#include "index_writer.h"
#include "instance_lock.h"
#include "ipc/velamk_ipc.h"
#include "listening_socket.h"
#include "log.h"
#include "request_handler.h"
#include "request_log.h"
#include "server.h"
#include "settings.h"

namespace vela {

namespace {

constexpr int kStarted = 0;
constexpr int kNotStarted = 1;

/// How old a request that writes to the index may become before it is its turn.
constexpr std::chrono::milliseconds kWritePatience(5000);

/// How long requests in hand have to come to their end.
constexpr uint64_t kStopTime = 5000000;  // microseconds

/// Descriptors for everything but clients: the loop and its sources, and for each worker an index
/// and a media file.
constexpr rlim_t kOwnDescriptors = 48;
constexpr rlim_t kWorkerDescriptors = 4;

/// Raises the process's limit for as many clients. Returns how many there can be.
size_t MakeRoomForClients(int wanted, int workers) {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return static_cast<size_t>(wanted);
  const rlim_t own = kOwnDescriptors + static_cast<rlim_t>(workers) * kWorkerDescriptors;
  const rlim_t needed = static_cast<rlim_t>(wanted) + own;
  if (limit.rlim_cur < needed) {
    limit.rlim_cur = std::min(needed, limit.rlim_max);
    setrlimit(RLIMIT_NOFILE, &limit);
    getrlimit(RLIMIT_NOFILE, &limit);
  }
  if (limit.rlim_cur >= needed) return static_cast<size_t>(wanted);
  const rlim_t spare = limit.rlim_cur > own ? limit.rlim_cur - own : 1;
  return static_cast<size_t>(spare);
}

void TellManagerReload() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  const long long microseconds = now.tv_sec * 1000000LL + now.tv_nsec / 1000;
  sd_notifyf(0, "RELOADING=1\nMONOTONIC_USEC=%lld", microseconds);
}

class Service {
 public:
  explicit Service(const Options& options) : options_(options), log_(options.logRequests) {}

  /// Returns what went wrong, empty when nothing did.
  std::string Start();

  /// Serves until a signal comes.
  void Run();

 private:
  static int OnEndSignal(sd_event_source* source, const signalfd_siginfo* info, void* service);
  static int OnReloadSignal(sd_event_source* source, const signalfd_siginfo* info, void* service);
  static int OnStopTime(sd_event_source* source, uint64_t time, void* service);

  std::string FindOptionsGroup();
  std::string OpenIndex();
  std::string OpenSocket();
  std::string StartServer();
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

std::string Service::FindOptionsGroup() {
  if (options_.group.empty()) return {};
  gid_t id = 0;
  std::string problem = FindGroup(options_.group, id);
  if (problem.empty()) group_ = id;
  return problem;
}

std::string Service::OpenIndex() {
  const IndexFile file = {options_.database, group_};
  std::string problem = LockIndex(file, lock_);
  if (!problem.empty()) return problem;
  index_ = std::make_unique<IndexStore>(file);
  handler_ = std::make_unique<RequestHandler>(*index_);
  writer_ = std::make_unique<IndexWriter>(*index_, kWritePatience);
  const IndexResult opened = index_->Open();
  return opened.IsOk() ? std::string() : file.path + ": " + opened.message;
}

std::string Service::OpenSocket() {
  bool isTaken = false;
  const std::string problem = socket_.TakeFromManager(isTaken);
  if (!problem.empty() || isTaken) return problem;
  return socket_.Make(PluginDaemonSocketPath, group_);
}

void Service::LoadSettings(const char* event) {
  std::string warning;
  const Settings settings = ReadSettings(warning);
  server_->SetSettings(settings);
  if (!warning.empty()) LogLine(LogLevel::kWarning, event).Add("problem", warning).Write();
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
    TellManagerReload();
    static_cast<Service*>(service)->LoadSettings("settings");
  } catch (const std::exception&) {
    return 0;  // the settings stay as they were
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
  if (result >= 0) result = sd_event_add_signal(loop_.get(), nullptr, SIGINT, OnEndSignal, this);
  if (result >= 0) result = sd_event_add_signal(loop_.get(), nullptr, SIGHUP, OnReloadSignal, this);
  return result;
}

std::string Service::StartServer() {
  sd_event* loop = nullptr;
  int result = sd_event_new(&loop);
  loop_.reset(loop);
  if (result >= 0) result = WatchSignals();
  if (result < 0) return std::string("event loop: ") + std::strerror(-result);
  ServerLimits limits;
  limits.workers = options_.workers;
  limits.clients = MakeRoomForClients(options_.maxClients, options_.workers);
  limits.clientTimeout = std::chrono::seconds(options_.clientTimeout);
  server_ = std::make_unique<Server>(loop, limits, *handler_, *writer_, log_);
  const int error = server_->Start(socket_.Fd());
  return error == 0 ? std::string() : std::string("event loop: ") + std::strerror(error);
}

std::string Service::Start() {
  std::string problem = FindOptionsGroup();
  if (problem.empty()) problem = OpenIndex();
  if (problem.empty()) problem = OpenSocket();
  if (problem.empty()) problem = StartServer();
  if (!problem.empty()) return problem;
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
  // Who asks twice does not want to wait.
  if (isStopping_) return EndLoop();
  isStopping_ = true;
  sd_notify(0, "STOPPING=1");
  // New clients are to see at once that nobody listens here. What the service manager listens at
  // waits for the next daemon.
  const bool isOwnSocket = socket_.Unlink();
  const int result = sd_event_add_time_relative(loop_.get(), nullptr, CLOCK_MONOTONIC, kStopTime, 0,
                                                OnStopTime, this);
  if (result < 0) EndLoop();
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
  const size_t inHand = server_->JobsInHand();
  if (inHand > 0) {
    LogLine(LogLevel::kWarning, "stop").Add("requests_left", static_cast<int64_t>(inHand)).Write();
    socket_.Unlink();
    // Their threads may wait for a disk that never answers; they cannot be joined.
    _exit(kStarted);
  }
}

/// Signals are for the loop alone, so that all threads have them blocked.
void PrepareSignals() {
  sigset_t handled;
  sigemptyset(&handled);
  for (const int number : {SIGTERM, SIGINT, SIGHUP}) sigaddset(&handled, number);
  pthread_sigmask(SIG_BLOCK, &handled, nullptr);
  std::signal(SIGPIPE, SIG_IGN);
}

}  // namespace

int RunService(const Options& options) {
  std::string problem;
  try {
    PrepareSignals();
    Service service(options);
    problem = service.Start();
    if (problem.empty()) {
      service.Run();
      return kStarted;
    }
  } catch (const std::exception& error) {
    problem = error.what();
  }
  LogLine(LogLevel::kError, "start").Add("error", problem).Write();
  return kNotStarted;
}

}  // namespace vela
