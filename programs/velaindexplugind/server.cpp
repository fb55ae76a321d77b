#include "server.h"

#include <cerrno>
#include <exception>
#include <iterator>
#include <list>
#include <utility>
#include <vector>

#include "posix/local_socket.h"

namespace vela {

namespace {

/// How many connections are accepted before other events are handled.
constexpr int kAcceptBatch = 16;

/// How long accepting pauses when the process lacks descriptors or memory for it.
constexpr uint64_t kAcceptPause = 100000;  // microseconds

/// How often idle clients are searched for.
constexpr uint64_t kSweepInterval = 250000;  // microseconds

/// Existing clients are served before new ones.
constexpr int64_t kListenerPriority = SD_EVENT_PRIORITY_NORMAL + 1;

/// How many requests are written in one transaction; other programs must not wait for too long.
constexpr size_t kWriteBatch = 256;

/// Returns whether only the connection at the head of the queue has failed.
bool IsTransient(int error) {
  return error == ECONNABORTED || error == EINTR || error == EPROTO || error == EPERM;
}

/// Carries out jobs; every job gets an answer.
void CarryOut(const RequestHandler& handler, std::list<Job>& jobs) {
  for (Job& job : jobs) {
    try {
      job.answer = handler.Handle(job.request, job.settings);
    } catch (...) {
      // An empty line means out of memory.
      job.answer.line.clear();
    }
  }
}

uint32_t EventsFor(Connection::State state) {
  switch (state) {
    case Connection::State::kReceiving:
    case Connection::State::kDraining:
      return EPOLLIN;
    case Connection::State::kSending:
      return EPOLLOUT;
    case Connection::State::kWorking:
      break;
  }
  // The end of the connection is reported even without a requested event.
  return 0;
}

}  // namespace

struct Server::Client {
  Client(Server& owner, uint64_t number, FileDescriptor socket, Clock::time_point now)
      : server(owner), id(number), connection(std::move(socket), now), begin(now) {}

  Server& server;
  const uint64_t id;
  Connection connection;
  const Clock::time_point begin;
  EventSource source;
  WorkerPool* pool = nullptr;  ///< that has its request
};

Server::Server(sd_event* loop, const ServerLimits& limits, const RequestHandler& handler,
               const IndexWriter& writer, RequestLog& log)
    : loop_(loop), limits_(limits), handler_(handler), writer_(writer), log_(log) {}

Server::~Server() = default;

int Server::WatchListener(int listener) {
  listener_ = listener;
  sd_event_source* source = nullptr;
  const int result = sd_event_add_io(loop_, &source, listener, EPOLLIN, OnListener, this);
  listenerSource_.reset(source);
  if (result < 0) {
    return -result;
  }
  return -sd_event_source_set_priority(source, kListenerPriority);
}

int Server::Start(int listener) {
  const int error = done_.Open();
  if (error != 0) {
    return error;
  }
  sd_event_source* source = nullptr;
  const int result = sd_event_add_io(loop_, &source, done_.Fd(), EPOLLIN, OnDone, this);
  doneSource_.reset(source);
  if (result < 0) {
    return -result;
  }
  const auto work = [this](std::list<Job>& jobs) { CarryOut(handler_, jobs); };
  const auto write = [this](std::list<Job>& jobs) { writer_.CarryOut(jobs); };
  files_ = std::make_unique<WorkerPool>(limits_.workers, 1, work, done_);
  indexReads_ = std::make_unique<WorkerPool>(1, 1, work, done_);
  indexWrites_ = std::make_unique<WorkerPool>(1, kWriteBatch, write, done_);
  return WatchListener(listener);
}

int Server::OnListener(sd_event_source* /*source*/, int /*fd*/, uint32_t /*events*/, void* server) {
  static_cast<Server*>(server)->AcceptSome();
  return 0;
}

int Server::OnPauseEnd(sd_event_source* /*source*/, uint64_t /*time*/, void* server) {
  auto& paused = *static_cast<Server*>(server);
  paused.pauseSource_.reset();
  paused.ResumeAccepting();
  return 0;
}

int Server::OnClient(sd_event_source* /*source*/, int /*fd*/, uint32_t events, void* client) {
  auto& served = *static_cast<Client*>(client);
  served.server.Serve(served, events);
  return 0;
}

int Server::OnDone(sd_event_source* /*source*/, int /*fd*/, uint32_t /*events*/, void* server) {
  static_cast<Server*>(server)->TakeDoneJobs();
  return 0;
}

int Server::OnSweep(sd_event_source* /*source*/, uint64_t /*time*/, void* server) {
  static_cast<Server*>(server)->Sweep();
  return 0;
}

/// Returns whether more connections may be in the queue.
bool Server::AcceptSome() {
  for (int i = 0; i < kAcceptBatch; ++i) {
    if (clients_.size() + abandonedJobs_ >= limits_.clients) {
      sd_event_source_set_enabled(listenerSource_.get(), SD_EVENT_OFF);
      return false;
    }
    FileDescriptor socket = AcceptLocal(listener_);
    if (socket.IsOpen()) {
      AddClient(std::move(socket));
    } else if (errno == EAGAIN) {
      return false;
    } else if (!IsTransient(errno)) {
      PauseAccepting(errno);
      return false;
    }
  }
  return true;
}

/// Without a pause the loop would spin, because the connection stays in the queue.
void Server::PauseAccepting(int error) {
  sd_event_source* source = nullptr;
  const int result = sd_event_add_time_relative(loop_, &source, CLOCK_MONOTONIC, kAcceptPause, 0,
                                                OnPauseEnd, this);
  pauseSource_.reset(source);
  if (result >= 0) {
    sd_event_source_set_enabled(listenerSource_.get(), SD_EVENT_OFF);
  }
  try {
    log_.WriteAcceptFailure(error);
  } catch (const std::exception&) {
    return;  // out of memory for the line
  }
}

void Server::ResumeAccepting() {
  if (listenerSource_) {
    sd_event_source_set_enabled(listenerSource_.get(), SD_EVENT_ON);
  }
}

void Server::AddClient(FileDescriptor socket) {
  Client* client = nullptr;
  try {
    const uint64_t id = ++lastClient_;
    auto made = std::make_unique<Client>(*this, id, std::move(socket), Clock::now());
    client = made.get();
    clients_.emplace(id, std::move(made));
  } catch (const std::exception&) {
    return;  // closes the connection
  }
  // Most clients have already sent their request.
  Serve(*client, EPOLLIN);
}

/// An error with one client closes its connection and affects nothing else.
void Server::Serve(Client& client, uint32_t events) {
  try {
    Step(client, events);
  } catch (const std::exception&) {
    Drop(client);
  }
}

/// May destroy the client.
void Server::Step(Client& client, uint32_t events) {
  switch (client.connection.GetState()) {
    case Connection::State::kReceiving:
      Receive(client);
      return;
    case Connection::State::kSending:
      SendReply(client);
      return;
    case Connection::State::kDraining:
      if (!client.connection.Drain()) {
        Drop(client);
      }
      return;
    case Connection::State::kWorking:
      if ((events & (EPOLLHUP | EPOLLERR)) != 0) {
        Drop(client);
      }
      return;
  }
}

void Server::Receive(Client& client) {
  switch (client.connection.Receive(Clock::now())) {
    case Connection::Received::kMore:
      Watch(client);
      return;
    case Connection::Received::kLine:
      Dispatch(client);
      return;
    case Connection::Received::kTooLong:
      Refuse(client, "the request is longer than 65536 bytes", true);
      return;
    case Connection::Received::kEnd:
      Drop(client);
      return;
  }
}

void Server::Dispatch(Client& client) {
  Request request;
  const std::string mistake = ParseRequest(client.connection.Line(), request);
  if (!mistake.empty()) {
    Refuse(client, mistake, false);
    return;
  }
  const std::string objection = ObjectionTo(request.command, PeerOf(client.connection.Fd()));
  if (!objection.empty()) {
    Finish(client, &request, {FailureReply(objection), Outcome::kRefused, objection}, false);
  } else if (PlaceOf(request.command) == WorkPlace::kEventLoop) {
    Finish(client, &request, handler_.Handle(request, settings_), false);
  } else {
    GiveToWorkers(client, std::move(request));
  }
}

void Server::GiveToWorkers(Client& client, Request request) {
  const WorkPlace place = PlaceOf(request.command);
  std::list<Job> job(1);
  job.front().client = client.id;
  job.front().request = std::move(request);
  job.front().settings = settings_;
  job.front().arrival = Clock::now();
  client.connection.BeginWork();
  Watch(client);
  WorkerPool* const indexPool = (place == WorkPlace::kIndexRead ? indexReads_ : indexWrites_).get();
  client.pool = place == WorkPlace::kFiles ? files_.get() : indexPool;
  client.pool->Add(job);
  ++pendingJobs_;
}

void Server::TakeDoneJobs() {
  for (Job& job : done_.Take()) {
    --pendingJobs_;
    TakeDoneJob(job);
  }
  ReportIdle();
}

void Server::TakeDoneJob(Job& job) {
  const auto found = clients_.find(job.client);
  if (found == clients_.end()) {
    ReleaseAbandoned();
    return;
  }
  Client& client = *found->second;
  client.pool = nullptr;
  try {
    Finish(client, &job.request, std::move(job.answer), false);
  } catch (const std::exception&) {
    Drop(client);
  }
}

void Server::Refuse(Client& client, const std::string& error, bool drains) {
  Finish(client, nullptr, {FailureReply(error), Outcome::kRefused, error}, drains);
}

void Server::Finish(Client& client, const Request* request, Answer answer, bool drains) {
  if (answer.line.empty()) {
    answer = {kLastResortReply, Outcome::kFault, "out of memory"};
  }
  log_.Write(request, answer, client.connection.Fd(), client.begin);
  client.connection.BeginReply(std::move(answer.line), drains, Clock::now());
  SendReply(client);
}

void Server::SendReply(Client& client) {
  const Connection::Sent sent = client.connection.Send(Clock::now());
  if (sent == Connection::Sent::kMore) {
    Watch(client);
  } else {
    Drop(client);
  }
}

/// Waits for the events that the connection's state requires. A client that cannot be watched is
/// closed by the idle timeout.
void Server::Watch(Client& client) {
  ArmSweep();
  const uint32_t events = EventsFor(client.connection.GetState());
  if (client.source) {
    sd_event_source_set_io_events(client.source.get(), events);
    return;
  }
  sd_event_source* source = nullptr;
  const int fd = client.connection.Fd();
  if (sd_event_add_io(loop_, &source, fd, events, OnClient, &client) >= 0) {
    client.source.reset(source);
  }
}

void Server::ArmSweep() {
  if (isSweepArmed_) {
    return;
  }
  if (sweepSource_) {
    isSweepArmed_ = sd_event_source_set_time_relative(sweepSource_.get(), kSweepInterval) >= 0 &&
                    sd_event_source_set_enabled(sweepSource_.get(), SD_EVENT_ONESHOT) >= 0;
    return;
  }
  sd_event_source* source = nullptr;
  const int result =
      sd_event_add_time_relative(loop_, &source, CLOCK_MONOTONIC, kSweepInterval, 0, OnSweep, this);
  sweepSource_.reset(source);
  isSweepArmed_ = result >= 0;
}

void Server::Sweep() {
  isSweepArmed_ = false;
  const Clock::time_point now = Clock::now();
  for (auto next = clients_.begin(); next != clients_.end();) {
    const Client& client = *(next++)->second;
    if (client.connection.IsOverdue(now, limits_.clientTimeout)) {
      Drop(client);
    }
  }
  if (!clients_.empty()) {
    ArmSweep();
  }
}

void Server::Drop(const Client& client) {
  if (client.pool != nullptr) {
    Abandon(client);
  }
  clients_.erase(client.id);
  // A pause has another cause and continues.
  if (!pauseSource_) {
    ResumeAccepting();
  }
  ReportIdle();
}

/// Cancels the request of a client that has disconnected, unless it is a write or has been started.
/// A job that remains counts as a client, because there is no other limit to their number.
void Server::Abandon(const Client& client) {
  if (client.pool != indexWrites_.get() && client.pool->Remove(client.id)) {
    --pendingJobs_;
  } else {
    ++abandonedJobs_;
  }
}

void Server::ReleaseAbandoned() {
  --abandonedJobs_;
  if (!pauseSource_) {
    ResumeAccepting();
  }
}

/// A request that has already arrived is still answered.
void Server::DropClientsWithoutRequest() {
  std::vector<uint64_t> waiting;
  for (const auto& [id, client] : clients_) {
    if (client->connection.GetState() == Connection::State::kReceiving) {
      waiting.push_back(id);
    }
  }
  for (const uint64_t id : waiting) {
    Serve(*clients_.at(id), EPOLLIN);
    const auto found = clients_.find(id);
    const bool isWaiting = found != clients_.end() &&
                           found->second->connection.GetState() == Connection::State::kReceiving;
    if (isWaiting) {
      Drop(*found->second);
    }
  }
}

void Server::BeginStop(bool acceptsQueued, std::function<void()> onIdle) {
  while (acceptsQueued && AcceptSome()) {
  }
  listenerSource_.reset();
  pauseSource_.reset();
  DropClientsWithoutRequest();
  onIdle_ = std::move(onIdle);
  ReportIdle();
}

void Server::ReportIdle() {
  if (onIdle_ && clients_.empty() && pendingJobs_ == 0) {
    onIdle_();
  }
}

}  // namespace vela
