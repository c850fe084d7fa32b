#include "sensor/Compass.h"

#include <KD/kdext.h>

#include "util/Logger.h"

namespace Sensor {

Compass::Compass() : handle(0) {}

Compass::~Compass() {
    cancel();
}

void Compass::start(const callback<void (*)(int)>& newOnAzimuth) {
    cancel();
    onAzimuth = newOnAzimuth;
    kdInstallCallback(&Compass::onCompassEvent, KD_EVENT_COMPASS_ZVR, this);
    handle = kdSetCompassZVR(this);
    if (handle == 0) {
        Logger::log(Logger::Error, "Compass: the platform refused to start the compass");
        kdInstallCallback(nullptr, KD_EVENT_COMPASS_ZVR, this);
        onAzimuth = callback<void (*)(int)>();
    }
}

void Compass::cancel() {
    if (handle == 0) {
        return;
    }
    // Removing the binding also discards the reports still queued for us.
    kdInstallCallback(nullptr, KD_EVENT_COMPASS_ZVR, this);
    kdCancelCompassZVR(handle);
    onAzimuth = callback<void (*)(int)>();
    handle = 0;
}

void Compass::onCompassEvent(const KDEvent* event) {
    Compass* self = static_cast<Compass*>(event->userptr);
    if (self != nullptr) {
        self->onAzimuth(static_cast<int>(event->data.words[0]));
    }
}

}  // namespace Sensor
