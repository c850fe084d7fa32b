// Internal interface between the parts of the desktop platform layer: the
// event and timer core (Events.cpp, Timers.cpp) offers these to the simulated
// services and the graphics context.
#pragma once

#include <KD/kd.h>

#include <cstdint>
#include <functional>

namespace pal::detail {

// The thread that called pal::start(), or null before.
KDThread* mainThread();
// Clears the main thread when its record, `ending`, is torn down.
void forgetMainThread(KDThread* ending);

// Posts a copy-free event to a thread's queue; takes ownership (kdPostThreadEvent).
void post(KDThread* thread, KDEvent* event);

// Removes and frees the events queued for thread for which match returns true,
// without releasing their payloads (the caller does that if it must).
// match runs under the queue lock: it may release records but must not post.
void discardEvents(KDThread* thread, const std::function<bool(const KDEvent&)>& match);

// Runs action once, delay ns from now, on owner's event loop (or, on the
// virtual clock, inside pal::advanceTime when owner is the advancing thread;
// otherwise at owner's next pump after the time has passed). Returns an id
// for cancelAction. Simulated services use it to answer "after a delay".
using ActionId = std::uint64_t;
ActionId scheduleAction(KDThread* owner, KDust delay, std::function<void()> action);
// Cancels a scheduled action that has not run yet; unknown ids are ignored.
void cancelAction(ActionId id);

// Writes one line to the log sink.
void writeLogLine(const char* line);

}  // namespace pal::detail
