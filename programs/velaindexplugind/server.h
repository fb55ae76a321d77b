// Serves all connections of the daemon.
#pragma once

#include <systemd/sd-event.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <unordered_map>

#include "connection.h"
#include "event_source.h"
#include "index_writer.h"
#include "request_handler.h"
#include "request_log.h"
#include "worker_pool.h"

namespace vela {

/// Limits on concurrency and time.
struct ServerLimits {
  int workers = 4;                         ///< threads that read media files
  size_t clients = 2048;                   ///< connections; further ones wait in the socket's queue
  std::chrono::seconds clientTimeout{30};  ///< for an idle client
};

/// Accepts connections, receives requests and answers them. All of this happens on the event loop's
/// thread, except that most requests are carried out by other threads.
class Server {
 public:
  Server(sd_event* loop, const ServerLimits& limits, const RequestHandler& handler,
         const IndexWriter& writer, RequestLog& log);
  ~Server();
  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;

  /// Starts accepting connections from the listening socket. Returns 0 or an errno value; throws
  /// std::system_error when threads cannot be started.
  int Start(int listener);

  /// Sets the settings for the requests that follow.
  void SetSettings(const Settings& settings) { settings_ = settings; }

  /// Stops accepting connections, with `acceptsQueued` only after those in the socket's queue, and
  /// closes those that have not sent a request. Calls `onIdle` when the last request is answered.
  /// The listening socket may be closed when this returns.
  void BeginStop(bool acceptsQueued, std::function<void()> onIdle);

  /// Returns the number of requests in progress.
  size_t PendingJobs() const { return pendingJobs_; }

 private:
  using Clock = Connection::Clock;
  struct Client;

  static int OnListener(sd_event_source* source, int fd, uint32_t events, void* server);
  static int OnPauseEnd(sd_event_source* source, uint64_t time, void* server);
  static int OnClient(sd_event_source* source, int fd, uint32_t events, void* client);
  static int OnDone(sd_event_source* source, int fd, uint32_t events, void* server);
  static int OnSweep(sd_event_source* source, uint64_t time, void* server);

  int WatchListener(int listener);
  bool AcceptSome();
  void PauseAccepting(int error);
  void ResumeAccepting();
  void DropClientsWithoutRequest();
  void AddClient(FileDescriptor socket);
  void Serve(Client& client, uint32_t events);
  void Step(Client& client, uint32_t events);
  void Receive(Client& client);
  void Dispatch(Client& client);
  void GiveToWorkers(Client& client, Request request);
  void TakeDoneJobs();
  void TakeDoneJob(Job& job);
  void Refuse(Client& client, const std::string& error, bool drains);
  void Finish(Client& client, const Request* request, Answer answer, bool drains);
  void SendReply(Client& client);
  void Watch(Client& client);
  void Sweep();
  void ArmSweep();
  void Drop(const Client& client);
  void Abandon(const Client& client);
  void ReleaseAbandoned();
  void ReportIdle();

  sd_event* const loop_;
  const ServerLimits limits_;
  const RequestHandler& handler_;
  const IndexWriter& writer_;
  RequestLog& log_;
  Settings settings_;
  std::function<void()> onIdle_;  ///< set while the server is stopping

  DoneJobs done_;
  size_t pendingJobs_ = 0;
  size_t abandonedJobs_ = 0;  ///< pending ones whose clients have disconnected
  std::unordered_map<uint64_t, std::unique_ptr<Client>> clients_;
  uint64_t lastClient_ = 0;
  int listener_ = -1;
  EventSource listenerSource_;
  EventSource pauseSource_;
  EventSource doneSource_;
  EventSource sweepSource_;
  bool isSweepArmed_ = false;

  // Declared last, so destroyed first: their threads use the members above.
  std::unique_ptr<WorkerPool> files_;
  std::unique_ptr<WorkerPool> indexReads_;
  std::unique_ptr<WorkerPool> indexWrites_;
};

}  // namespace vela
