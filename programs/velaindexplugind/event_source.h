// Owners of the event loop and of what it waits for.
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
/// Something the loop waits for, until the object ends; its descriptor must live longer.
using EventSource = std::unique_ptr<sd_event_source, EventSourceCloser>;

}  // namespace vela
