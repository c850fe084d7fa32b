#pragma once

#include <functional>

#include "location/LocationListener.h"

// The application's listener of the location manager. When armed, it acts
// from inside the next position it hears: the scenario stops or destroys the
// statistics collector (itself a listener of the same manager) or removes
// this listener. Main thread only.
class LocationWatcher : public Location::LocationListener {
public:
    typedef std::function<void()> Hook;

    explicit LocationWatcher(Hook onPosition) : onPosition(onPosition), armed(false), heard(0) {}

    void arm() { armed = true; }
    int positionsHeard() const { return heard; }

    void onLocationChanged(Location::LocationManager*, const Location::Location&) override {
        ++heard;
        if (armed) {
            armed = false;
            onPosition();
        }
    }

private:
    Hook onPosition;
    bool armed;
    int heard;
};
