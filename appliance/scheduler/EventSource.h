// Handles of the event loop, released at their end.
#pragma once

#include <systemd/sd-event.h>

#include <memory>

namespace orva {

struct EventUnref {
    void operator()(sd_event* event) const { sd_event_unref(event); }
};
using Event = std::unique_ptr<sd_event, EventUnref>;

// Its callback is not called any more once it is gone.
struct EventSourceUnref {
    void operator()(sd_event_source* source) const { sd_event_source_disable_unref(source); }
};
using EventSource = std::unique_ptr<sd_event_source, EventSourceUnref>;

}  // namespace orva
