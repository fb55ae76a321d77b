// Whether a service processes the queue.
#pragma once

#include <chrono>
#include <string>

namespace vela {

/// The states of the service's units. The default is that of a machine without the service.
struct ServiceState {
  bool isKnown = true;       ///< false: there is a systemd, but it has not answered
  bool isRunning = false;    ///< velathumb-queue.service runs or is being started
  bool isStopping = false;   ///< it is being stopped
  bool hasFailed = false;    ///< its last run, or the path unit, has failed
  bool isWatching = false;   ///< velathumb-queue.path starts it when there is a queue
  bool isScheduled = false;  ///< velathumb-queue.timer starts it from time to time
  bool isEnabled = false;    ///< one of the units is started at boot
};

/// Returns whether the work is to be left to the service: it runs, or an administrator wants it to.
/// False when that is not known.
bool HasService(const ServiceState& state);

/// How urgent it is that the user reads about the service.
struct ServiceText {
  bool needsAction = false;  ///< the user has to do something before the work is done
  std::string text;
};

/// Who does the work while a runner is running, as the end of a sentence.
inline constexpr char kRunningText[] = "the running velathumb-queue does the work";

/// Returns who does the work, and what the user has to do when that is not certain, as the end of a
/// sentence. Only for a state with a service or one that is not known.
ServiceText DescribeService(const ServiceState& state);

/// Asks systemd for the states of the units, for at most `limit`. A machine that does not run
/// systemd has no service; when systemd does not answer, the state is not known.
ServiceState AskForService(std::chrono::seconds limit);

}  // namespace vela
