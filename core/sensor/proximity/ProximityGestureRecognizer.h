#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <list>
#include <string>

#include "sensor/proximity/ProximityGesture.h"
#include "util/callback.h"

namespace Sensor {

// Turns the proximity sensor's covered/uncovered changes into named gestures:
// it keeps the lengths of the last periods, compares them with every
// registered gesture after each change and reports the best match by name,
// then starts afresh. Periods shorter than minPeriod are sensor flicker and
// cancel out. Thread that calls start() only; events and the callback arrive
// there.
class ProximityGestureRecognizer {
public:
    ProximityGestureRecognizer();
    ~ProximityGestureRecognizer();

    // False, with a log line, for a timeline that is empty, holds other
    // characters than '*' and '-', has more periods than are observed, or
    // could be confused with a registered gesture.
    bool addGesture(const std::string& name, const std::string& timeline);
    bool addGesture(const boost::shared_ptr<ProximityGesture>& gesture);
    // The first registered gesture the new one could be confused with, in
    // either direction; empty when none.
    boost::shared_ptr<ProximityGesture> findCollision(const boost::shared_ptr<ProximityGesture>& gesture) const;
    void setCallback(const callback<void (*)(const std::string&)>& newOnGesture);

    // Both log their failures (already running, no gestures, not running) and
    // then do nothing.
    void start();
    void stop();
    bool isRunning() const { return listener != 0; }

    // value: whether the sensor has just become covered.
    void onSensorEvent(bool value);
    static void proximityCallback(const KDEvent* event);

    // Observed period lengths in ms since the last recognition, oldest first.
    const std::list<int>& getPeriods() const { return periods; }

private:
    ProximityGestureRecognizer(const ProximityGestureRecognizer&) = delete;
    ProximityGestureRecognizer& operator=(const ProximityGestureRecognizer&) = delete;

    void testGestures();

    const int minPeriod;
    const unsigned int maxPeriods;
    std::list<boost::shared_ptr<ProximityGesture> > gestures;
    std::list<int> periods;
    bool lastPeriodCovered;
    long long lastEventTime;
    callback<void (*)(const std::string&)> onGesture;
    KDint listener;
};

}  // namespace Sensor
