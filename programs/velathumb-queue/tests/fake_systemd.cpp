#include "fake_systemd.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <systemd/sd-bus.h>

#include <cstring>
#include <utility>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/removal.h"

namespace vela_test {

namespace {

constexpr char kSocket[] = "/run/systemd/private";
constexpr int kPauseMilliseconds = 20;

std::string ActiveState(const FakeUnits& units, const char* unit) {
  const auto found = units.active.find(unit);
  return found == units.active.end() ? "inactive" : found->second;
}

int AnswerList(sd_bus_message* call, const FakeUnits& units) {
  sd_bus_message* reply = nullptr;
  sd_bus_message_new_method_return(call, &reply);
  sd_bus_message_open_container(reply, 'a', "(ssssssouso)");
  sd_bus_message_enter_container(call, 'a', "s");
  for (const char* unit = nullptr; sd_bus_message_read(call, "s", &unit) > 0;) {
    sd_bus_message_append(reply, "(ssssssouso)", unit, "", "loaded",
                          ActiveState(units, unit).c_str(), "", "", "/a", 0U, "", "/");
  }
  sd_bus_message_close_container(reply);
  const int result = sd_bus_send(nullptr, reply, nullptr);
  sd_bus_message_unref(reply);
  return result < 0 ? result : 1;
}

int AnswerState(sd_bus_message* call, const FakeUnits& units) {
  const char* unit = "";
  sd_bus_message_read(call, "s", &unit);
  if (units.enabled.count(unit) == 0) {
    return sd_bus_reply_method_errorf(call, "org.freedesktop.systemd1.NoSuchUnit", "unknown");
  }
  return sd_bus_reply_method_return(call, "s", "enabled");
}

int Answer(sd_bus_message* call, void* data, sd_bus_error* /*error*/) {
  const auto& units = *static_cast<const FakeUnits*>(data);
  constexpr char kInterface[] = "org.freedesktop.systemd1.Manager";
  if (sd_bus_message_is_method_call(call, kInterface, "ListUnitsByNames") > 0) {
    return AnswerList(call, units);
  }
  if (sd_bus_message_is_method_call(call, kInterface, "GetUnitFileState") > 0) {
    return AnswerState(call, units);
  }
  return 0;
}

/// Answers on one connection until that ends.
void Converse(int connection, const FakeUnits& units, const std::atomic<bool>& isEnding) {
  sd_bus* bus = nullptr;
  sd_id128_t id = {};
  sd_id128_randomize(&id);
  sd_bus_new(&bus);
  sd_bus_set_fd(bus, connection, connection);
  sd_bus_set_server(bus, 1, id);
  sd_bus_add_filter(bus, nullptr, Answer, const_cast<FakeUnits*>(&units));
  int result = sd_bus_start(bus);
  while (result >= 0 && !isEnding) {
    result = sd_bus_process(bus, nullptr);
    if (result == 0) {
      result = sd_bus_wait(bus, kPauseMilliseconds * 1000);
    }
  }
  sd_bus_close_unref(bus);
}

}  // namespace

Descriptor MakeSilentSystemd() {
  MakeDirectories("/run/systemd/system");
  RemoveTree(kSocket);
  Descriptor listener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocket);
  if (bind(listener.Get(), reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
      listen(listener.Get(), 8) != 0) {
    EnvironmentFailureWithErrno("cannot make the socket of systemd");
  }
  return listener;
}

FakeSystemd::FakeSystemd(FakeUnits units)
    : units_(std::move(units)), listener_(MakeSilentSystemd()), thread_([this] { Serve(); }) {}

FakeSystemd::~FakeSystemd() {
  isEnding_ = true;
  thread_.join();
  RemoveTree("/run/systemd");
}

void FakeSystemd::Serve() {
  while (!isEnding_) {
    pollfd ready = {listener_.Get(), POLLIN, 0};
    if (poll(&ready, 1, kPauseMilliseconds) > 0) {
      // The connection belongs to the bus, which closes it.
      Converse(accept4(listener_.Get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK), units_,
               isEnding_);
    }
  }
}

}  // namespace vela_test
