// Owners of the event loop and of its event sources.
#pragma once

#include <systemd/sd-event.h>

#include <memory>

namespace vela {

struct EventLoopCloser {
  void operator()(sd_event* event) const { sd_event_unref(event); }
};
using EventLoop = std::unique_ptr<sd_event, EventLoopCloser>;

struct EventSourceCloser {
  void operator()(sd_event_source* source) const { sd_event_source_disable_unref(source); }
};
/// An event that the loop waits for during the lifetime of the object; its descriptor must live
/// longer.
using EventSource = std::unique_ptr<sd_event_source, EventSourceCloser>;

}  // namespace vela
