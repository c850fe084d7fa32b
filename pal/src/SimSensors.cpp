// Simulated motion sensors: compass and proximity listeners, and the
// accelerometer whose samples are records handed back by the receiver.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <memory>
#include <mutex>
#include <unordered_map>
#include <vector>

#include "Runtime.h"
#include "SimInternal.h"
#include "SimListenerSet.h"

struct KDAccelerometerZVR {
    KDThread* thread = nullptr;
    void* userptr = nullptr;
    bool enabled = false;
};

namespace {

using SampleMap = std::unordered_map<KDAccelerationZVR*, std::unique_ptr<KDAccelerationZVR>>;

struct AccelerometerState {
    std::unordered_map<KDAccelerometerZVR*, std::unique_ptr<KDAccelerometerZVR>> accelerometers;
    float interval = 0.0f;
    // Samples handed out with event 120 and not dismissed yet.
    SampleMap samples;
};

std::mutex gMutex;
AccelerometerState gState;
// Samples handed out before a reset: no longer counted, but still freed when
// their receiver dismisses them, since their events may still be queued.
SampleMap gForgottenSamples;
pal::detail::SimListenerSet gCompassListeners(KD_EVENT_COMPASS_ZVR);
pal::detail::SimListenerSet gProximityListeners(KD_EVENT_PROXIMITY_ZVR);

// Data word 1 names the accelerometer an event belongs to, so that dismissing
// one discards exactly its own samples.
const int kAccelerometerWord = 1;

KDAccelerometerZVR* findLocked(KDAccelerometerZVR* accelerometer) {
    auto it = gState.accelerometers.find(accelerometer);
    return it != gState.accelerometers.end() ? it->second.get() : nullptr;
}

void setEnabled(KDAccelerometerZVR* accelerometer, bool enabled) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (KDAccelerometerZVR* known = findLocked(accelerometer)) {
        known->enabled = enabled;
    }
}

bool dismissSampleLocked(KDAccelerationZVR* sample) {
    return gState.samples.erase(sample) != 0 || gForgottenSamples.erase(sample) != 0;
}

void dismissSamples(const std::vector<KDAccelerationZVR*>& samples) {
    std::lock_guard<std::mutex> lock(gMutex);
    for (KDAccelerationZVR* sample : samples) {
        dismissSampleLocked(sample);
    }
}

void discardSamples(KDThread* thread, const KDAccelerometerZVR* accelerometer) {
    std::vector<KDAccelerationZVR*> samples;
    pal::detail::discardEvents(thread, [accelerometer, &samples](const KDEvent& event) {
        if (event.type != KD_EVENT_ACCELEROMETER_ZVR || event.data.p[kAccelerometerWord] != accelerometer) {
            return false;
        }
        samples.push_back(static_cast<KDAccelerationZVR*>(event.data.p[0]));
        return true;
    });
    dismissSamples(samples);
}

}  // namespace

extern "C" {

KDint kdSetCompassZVR(void* userptr) {
    return gCompassListeners.add(userptr);
}

void kdCancelCompassZVR(KDint handle) {
    gCompassListeners.remove(handle);
}

KDint kdStartListeningProximityEventsZVR(void* userptr) {
    return gProximityListeners.add(userptr);
}

void kdStopListeningProximityEventsZVR(KDint handle) {
    gProximityListeners.remove(handle);
}

KDAccelerometerZVR* kdAcquireAccelerometerZVR(void* userptr) {
    KDThread* thread = kdThreadSelf();
    if (thread == nullptr) {
        return nullptr;
    }
    auto accelerometer = std::make_unique<KDAccelerometerZVR>();
    accelerometer->thread = thread;
    accelerometer->userptr = userptr;
    KDAccelerometerZVR* handle = accelerometer.get();
    std::lock_guard<std::mutex> lock(gMutex);
    gState.accelerometers.emplace(handle, std::move(accelerometer));
    return handle;
}

void kdDismissAccelerometerZVR(KDAccelerometerZVR* accelerometer) {
    std::unique_ptr<KDAccelerometerZVR> owned;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        auto it = gState.accelerometers.find(accelerometer);
        if (it == gState.accelerometers.end()) {
            return;
        }
        owned = std::move(it->second);
        gState.accelerometers.erase(it);
    }
    discardSamples(owned->thread, owned.get());
}

void kdEnableAccelerometerZVR(KDAccelerometerZVR* accelerometer) {
    setEnabled(accelerometer, true);
}

void kdDisableAccelerometerZVR(KDAccelerometerZVR* accelerometer) {
    setEnabled(accelerometer, false);
}

void kdSetAccelerometerUpdateIntervalZVR(KDAccelerometerZVR* accelerometer, KDfloat32 interval) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (findLocked(accelerometer) != nullptr) {
        gState.interval = interval;
    }
}

void kdAccelerationDismissDataZVR(KDAccelerationZVR* record) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (!dismissSampleLocked(record) && record != nullptr) {
        pal::detail::writeLogLine(
            "pal: kdAccelerationDismissDataZVR: unknown or already dismissed sample ignored");
    }
}

}  // extern "C"

namespace pal {

int compassListeners() {
    return gCompassListeners.count();
}

void injectCompass(KDint azimuth) {
    gCompassListeners.notify(azimuth);
}

int proximityListeners() {
    return gProximityListeners.count();
}

void injectProximity(bool near) {
    gProximityListeners.notify(near ? 1 : 0);
}

bool isAccelerometerAcquired() {
    std::lock_guard<std::mutex> lock(gMutex);
    return !gState.accelerometers.empty();
}

bool isAccelerometerEnabled() {
    std::lock_guard<std::mutex> lock(gMutex);
    for (const auto& entry : gState.accelerometers) {
        if (entry.second->enabled) {
            return true;
        }
    }
    return false;
}

float accelerometerInterval() {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.interval;
}

void injectAcceleration(float x, float y, float z) {
    struct Delivery {
        KDThread* thread;
        KDAccelerometerZVR* accelerometer;
        KDEvent* event;
    };
    std::vector<Delivery> deliveries;
    {
        std::lock_guard<std::mutex> lock(gMutex);
        for (const auto& [handle, accelerometer] : gState.accelerometers) {
            if (!accelerometer->enabled) {
                continue;
            }
            auto sample = std::make_unique<KDAccelerationZVR>(KDAccelerationZVR{x, y, z});
            KDEvent* event = kdCreateEvent();
            event->type = KD_EVENT_ACCELEROMETER_ZVR;
            event->timestamp = kdGetTimeUST();
            event->userptr = accelerometer->userptr;
            event->data.p[0] = sample.get();
            event->data.p[kAccelerometerWord] = handle;
            gState.samples.emplace(sample.get(), std::move(sample));
            deliveries.push_back({accelerometer->thread, handle, event});
        }
    }
    for (const Delivery& delivery : deliveries) {
        pal::detail::post(delivery.thread, delivery.event);
        // A dismissal racing with this post may have swept the queue before
        // the sample landed in it; sweep again so that none outlives it.
        bool dismissed = false;
        {
            std::lock_guard<std::mutex> lock(gMutex);
            dismissed = findLocked(delivery.accelerometer) == nullptr;
        }
        if (dismissed) {
            discardSamples(delivery.thread, delivery.accelerometer);
        }
    }
}

int undismissedAccelerations() {
    std::lock_guard<std::mutex> lock(gMutex);
    return static_cast<int>(gState.samples.size());
}

namespace detail {

void resetSensors() {
    {
        std::lock_guard<std::mutex> lock(gMutex);
        for (auto& entry : gState.samples) {
            gForgottenSamples.insert(std::move(entry));
        }
        gState = AccelerometerState();
    }
    gCompassListeners.clear();
    gProximityListeners.clear();
}

}  // namespace detail
}  // namespace pal
