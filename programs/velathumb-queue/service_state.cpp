#include "service_state.h"

#include <systemd/sd-bus.h>

#include <array>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>
#include <utility>

#include "platform/velaindex.h"
#include "posix/accounts.h"
#include "posix/deadline.h"

namespace vela {

namespace {

using std::chrono::microseconds;

constexpr char kService[] = "velathumb-queue.service";
constexpr char kPath[] = "velathumb-queue.path";
constexpr char kTimer[] = "velathumb-queue.timer";

/// Exists where systemd is process 1.
constexpr char kSystemdDirectory[] = "/run/systemd/system";
/// Only for root, but also without a message bus.
constexpr char kPrivateAddress[] = "unix:path=/run/systemd/private";
constexpr char kSystemBusAddress[] = "unix:path=/run/dbus/system_bus_socket";

constexpr char kManagerName[] = "org.freedesktop.systemd1";
constexpr char kManagerPath[] = "/org/freedesktop/systemd1";
constexpr char kManagerInterface[] = "org.freedesktop.systemd1.Manager";

struct BusEnd {
  void operator()(sd_bus* bus) const { sd_bus_close_unref(bus); }
};
using Bus = std::unique_ptr<sd_bus, BusEnd>;

struct MessageEnd {
  void operator()(sd_bus_message* message) const { sd_bus_message_unref(message); }
};
using Message = std::unique_ptr<sd_bus_message, MessageEnd>;

uint64_t MicrosecondsLeft(const Deadline& deadline) {
  return static_cast<uint64_t>(std::chrono::ceil<microseconds>(deadline.Left()).count());
}

/// Waits until messages can be sent: the library's own calls would wait longer than the deadline.
bool AwaitReady(sd_bus* bus, const Deadline& deadline) {
  for (;;) {
    const int ready = sd_bus_is_ready(bus);
    if (ready != 0) {
      return ready > 0;
    }
    const int processed = sd_bus_process(bus, nullptr);
    if (processed < 0) {
      return false;
    }
    const uint64_t left = MicrosecondsLeft(deadline);
    if (left == 0 || (processed == 0 && sd_bus_wait(bus, left) < 0)) {
      return false;
    }
  }
}

/// Returns null when nothing answers at the address in time. `isShared`: it is that of a message
/// bus, not of systemd itself.
Bus Connect(const char* address, bool isShared, const Deadline& deadline) {
  sd_bus* created = nullptr;
  if (sd_bus_new(&created) < 0) {
    return nullptr;
  }
  Bus bus(created);
  const bool isStarted = sd_bus_set_address(bus.get(), address) >= 0 &&
                         sd_bus_set_bus_client(bus.get(), isShared ? 1 : 0) >= 0 &&
                         sd_bus_start(bus.get()) >= 0;
  return isStarted && AwaitReady(bus.get(), deadline) ? std::move(bus) : nullptr;
}

Bus ConnectToSystemd(const Deadline& deadline) {
  Bus bus;
  if (EffectiveUser() == 0) {
    bus = Connect(kPrivateAddress, false, deadline);
  }
  return bus != nullptr ? std::move(bus) : Connect(kSystemBusAddress, true, deadline);
}

Message NewCall(sd_bus* bus, const char* method) {
  sd_bus_message* created = nullptr;
  sd_bus_message_new_method_call(bus, &created, kManagerName, kManagerPath, kManagerInterface,
                                 method);
  return Message(created);
}

/// Returns null when the call fails.
Message Call(sd_bus* bus, const Message& call, const Deadline& deadline) {
  const uint64_t left = MicrosecondsLeft(deadline);
  sd_bus_message* reply = nullptr;
  // Zero would mean the library's own limit.
  if (call == nullptr || left == 0 || sd_bus_call(bus, call.get(), left, nullptr, &reply) < 0) {
    return nullptr;
  }
  return Message(reply);
}

/// Notes the state of a unit, in the words of systemd.
void NoteState(std::string_view unit, std::string_view active, ServiceState& state) {
  const bool isActive = active == "active" || active == "activating" || active == "reloading";
  const bool hasFailed = active == "failed";
  if (unit == kService) {
    state.isRunning = isActive;
    state.isStopping = active == "deactivating";
    state.hasFailed = state.hasFailed || hasFailed;
  } else if (unit == kPath) {
    state.isWatching = isActive;
    state.hasFailed = state.hasFailed || hasFailed;
  } else if (unit == kTimer) {
    state.isScheduled = isActive;
  }
}

/// Returns false when there was no answer.
bool ReadStates(sd_bus* bus, const Deadline& deadline, ServiceState& state) {
  const Message call = NewCall(bus, "ListUnitsByNames");
  if (call == nullptr || sd_bus_message_append(call.get(), "as", 3, kService, kPath, kTimer) < 0) {
    return false;
  }
  const Message reply = Call(bus, call, deadline);
  if (reply == nullptr ||
      sd_bus_message_enter_container(reply.get(), SD_BUS_TYPE_ARRAY, "(ssssssouso)") < 0) {
    return false;
  }
  const char* unit = nullptr;
  const char* active = nullptr;
  while (sd_bus_message_read(reply.get(), "(ssssssouso)", &unit, nullptr, nullptr, &active, nullptr,
                             nullptr, nullptr, nullptr, nullptr, nullptr) > 0) {
    NoteState(unit, active, state);
  }
  return true;
}

bool IsEnabled(sd_bus* bus, const char* unit, const Deadline& deadline) {
  const Message call = NewCall(bus, "GetUnitFileState");
  if (call == nullptr || sd_bus_message_append(call.get(), "s", unit) < 0) {
    return false;
  }
  const Message reply = Call(bus, call, deadline);
  const char* state = nullptr;
  return reply != nullptr && sd_bus_message_read(reply.get(), "s", &state) > 0 &&
         (std::strcmp(state, "enabled") == 0 || std::strcmp(state, "enabled-runtime") == 0);
}

}  // namespace

bool HasService(const ServiceState& state) {
  return state.isRunning || state.isWatching || state.isScheduled || state.isEnabled;
}

ServiceText DescribeService(const ServiceState& state) {
  if (!state.isKnown) {
    return {true,
            "but systemd does not answer: unless velathumb-queue.service does the work, start "
            "velathumb-queue"};
  }
  if (state.isRunning) {
    return {false, kRunningText};
  }
  // Also after a failure.
  if (state.isWatching) {
    return {false, "velathumb-queue.service does the work"};
  }
  if (state.hasFailed) {
    return {true,
            "but velathumb-queue.service has failed: systemctl status velathumb-queue.service "
            "tells why, systemctl start velathumb-queue.service starts it again"};
  }
  if (state.isScheduled) {
    return {false,
            "velathumb-queue.timer will start the service; to start it now: systemctl start "
            "velathumb-queue.service"};
  }
  return {true,
          "the service is enabled, but has not been started: systemctl start velathumb-queue.path "
          "velathumb-queue.timer"};
}

ServiceState AskForService(std::chrono::seconds limit) {
  ServiceState state;
  if (IsDirExist(kSystemdDirectory) == 0) {
    return state;
  }
  const Deadline deadline(limit);
  const Bus bus = ConnectToSystemd(deadline);
  if (bus == nullptr || !ReadStates(bus.get(), deadline, state)) {
    state.isKnown = false;
    return state;
  }
  for (const char* unit : {kService, kPath, kTimer}) {
    state.isEnabled = state.isEnabled || IsEnabled(bus.get(), unit, deadline);
  }
  state.isKnown = HasService(state) || MicrosecondsLeft(deadline) > 0;
  return state;
}

}  // namespace vela
