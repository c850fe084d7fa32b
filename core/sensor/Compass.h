#pragma once

#include <KD/kd.h>

#include "util/callback.h"

namespace Sensor {

// Reports every azimuth change of the device, in degrees, to one callback
// from start() until cancel() or destruction. Thread that starts it only; the
// reports arrive there.
class Compass {
public:
    Compass();
    ~Compass();

    // Replaces a running start: only the new callback is called from then on.
    void start(const callback<void (*)(int)>& onAzimuth);
    void cancel();
    bool isStarted() const { return handle != 0; }

    static void onCompassEvent(const KDEvent* event);

private:
    Compass(const Compass&) = delete;
    Compass& operator=(const Compass&) = delete;

    KDint handle;
    callback<void (*)(int)> onAzimuth;
};

}  // namespace Sensor
