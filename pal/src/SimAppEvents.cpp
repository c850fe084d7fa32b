// Simulated application events: pause/resume of the application and its view,
// storage mount changes and arbitrary events, all for the main thread.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include "Runtime.h"

namespace {

void postToMainThread(KDEvent* event) {
    KDThread* main = pal::detail::mainThread();
    if (main == nullptr) {
        // Before start() nobody could receive it; dropping it beats queueing
        // it for a thread that does not exist yet.
        kdFreeEvent(event);
        pal::detail::writeLogLine("pal: application event dropped: the platform layer is not started");
        return;
    }
    pal::detail::post(main, event);
}

void postType(KDint32 type) {
    KDEvent* event = kdCreateEvent();
    event->type = type;
    event->timestamp = kdGetTimeUST();
    postToMainThread(event);
}

}  // namespace

namespace pal {

void postAppPaused() {
    postType(KD_EVENT_PAUSE);
}
void postAppResumed() {
    postType(KD_EVENT_RESUME);
}
void postViewPaused() {
    postType(KD_EVENT_VIEW_PAUSE_ZVR);
}
void postViewResumed() {
    postType(KD_EVENT_VIEW_RESUME_ZVR);
}
void postStorageUnmounted() {
    postType(KD_EVENT_FS_UNMOUNTED_ZVR);
}
void postStorageMounted() {
    postType(KD_EVENT_FS_MOUNTED_ZVR);
}

void postToMain(const KDEvent& event) {
    KDEvent* copy = kdCreateEvent();
    *copy = event;
    postToMainThread(copy);
}

}  // namespace pal
