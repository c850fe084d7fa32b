// Internal interface of the simulated services of the desktop platform layer.
// Every function may be called from any thread.
#pragma once

#include <KD/kd.h>

namespace pal::detail {

// resetSimulation() (SimDevice.cpp) restores every service through these.
void resetRequests();
void resetRadios();
void resetSensors();
void resetAudio();
void resetGraphics();
void resetThreads();

// Hands back the payload of a simulated event that is freed without reaching
// a callback (no callback installed, or its callback removed while the event
// was queued): the records of events 107 and 111, the fix of 101 and the
// sample of 120. Without it those payloads would stay unreleased for ever.
// Must be called outside the queue lock, at most once per event.
void releaseUndeliveredPayload(const KDEvent& event);

}  // namespace pal::detail
