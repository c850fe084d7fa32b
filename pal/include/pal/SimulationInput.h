// Simulated user input for a view: pointer, key and gesture events and the
// view's own events, posted to the main thread with the view as user pointer
// (the platform addresses a view's events to its proxy). Any thread; the
// events are delivered when the main thread next dispatches.
#pragma once

#include <KD/kdext.h>

#include <cstddef>

namespace pal {

// Event 57 as the platform sends it: index KD_INPUT_POINTER_X/_Y for moves,
// KD_INPUT_POINTER_SELECT with select > 0 for a press, 0 for a release.
void postPointer(KDViewProxyZVR* view, KDint32 index, KDint32 select, KDint32 x, KDint32 y);
void postPointerMove(KDViewProxyZVR* view, KDint32 x, KDint32 y);
void postPointerSelect(KDViewProxyZVR* view, bool pressed);

// Event 56: key index and value (0 is a release).
void postKey(KDViewProxyZVR* view, KDint32 index, KDint32 value);

// Event 100. The data is laid out by byte offset: the sub-type as 32 bits at
// offset 0, then payload (at most 28 bytes) from offset 4.
void postGesture(KDViewProxyZVR* view, KDint32 subType, const void* payload, std::size_t payloadSize);
// Sub-type 3: dx and dy as 16 bits at offsets 4 and 6.
void postFling(KDViewProxyZVR* view, KDint16 dx, KDint16 dy);

// An event without data, such as 104, 106 or 48 (orientation).
void postViewEvent(KDViewProxyZVR* view, KDint32 type);

}  // namespace pal
