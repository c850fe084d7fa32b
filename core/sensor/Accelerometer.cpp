#include "sensor/Accelerometer.h"

#include <algorithm>
#include <boost/make_shared.hpp>

#include "util/Logger.h"

namespace Sensors {

Accelerometer::Accelerometer() : nativeAccelerometer(kdAcquireAccelerometerZVR(this)) {
    KD_ASSERT(nativeAccelerometer);
    kdInstallCallback(&Accelerometer::onAccelerate, KD_EVENT_ACCELEROMETER_ZVR, this);
}

Accelerometer::~Accelerometer() {
    // Also discards the samples still queued for us; the platform takes their
    // records back when the accelerometer is dismissed.
    kdInstallCallback(nullptr, KD_EVENT_ACCELEROMETER_ZVR, this);
    kdDismissAccelerometerZVR(nativeAccelerometer);
    nativeAccelerometer = nullptr;
    listeners.clear();
}

void Accelerometer::addAccelerometerListener(AccelerometerListener* listener) {
    KD_ASSERT(find(listeners.begin(), listeners.end(), listener) == listeners.end());
    if (isRegistered(listener)) {
        return;
    }
    if (listeners.empty()) {
        kdEnableAccelerometerZVR(nativeAccelerometer);
    }
    listeners.push_back(listener);
}

void Accelerometer::removeAccelerometerListener(AccelerometerListener* listener) {
    if (!listeners.empty()) {
        std::vector<AccelerometerListener*>::iterator it = std::find(listeners.begin(), listeners.end(), listener);
        KD_ASSERT(it != listeners.end());
        if (it != listeners.end()) {
            listeners.erase(it);
        }
    }
    if (listeners.empty()) {
        kdDisableAccelerometerZVR(nativeAccelerometer);
    }
}

bool Accelerometer::isRegistered(const AccelerometerListener* listener) const {
    return std::find(listeners.begin(), listeners.end(), listener) != listeners.end();
}

void Accelerometer::setUpdateInterval(float interval) {
    kdSetAccelerometerUpdateIntervalZVR(nativeAccelerometer, interval);
}

void Accelerometer::onAccelerate(const KDEvent* event) {
    Accelerometer* self = static_cast<Accelerometer*>(event->userptr);
    KDAccelerationZVR* record = static_cast<KDAccelerationZVR*>(event->data.p[0]);
    if (record == nullptr) {
        Logger::log(Logger::Error, "Accelerometer: sample without data ignored");
        return;
    }
    self->dispatch(boost::make_shared<Acceleration>(record->x, record->y, record->z,
                                                    static_cast<long long>(event->timestamp)));
    kdAccelerationDismissDataZVR(record);
}

// Listeners may come and go inside the calls: one added waits for the next
// sample, one removed or destroyed is not called any more.
void Accelerometer::dispatch(const boost::shared_ptr<Acceleration>& acceleration) {
    const std::vector<AccelerometerListener*> snapshot = listeners;
    for (AccelerometerListener* listener : snapshot) {
        if (isRegistered(listener)) {
            listener->onAccelerationChanged(this, acceleration);
        }
    }
}

}  // namespace Sensors
