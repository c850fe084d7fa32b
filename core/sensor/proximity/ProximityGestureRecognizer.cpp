#include "sensor/proximity/ProximityGestureRecognizer.h"

#include <KD/kdext.h>

#include <boost/make_shared.hpp>
#include <climits>

#include "util/Logger.h"

namespace Sensor {

namespace {

const long long kNanosecondsPerMillisecond = 1000000;

}  // namespace

ProximityGestureRecognizer::ProximityGestureRecognizer()
    : minPeriod(50),
      maxPeriods(10),
      lastPeriodCovered(false),
      lastEventTime(static_cast<long long>(kdGetTimeUST())),
      listener(0) {}

ProximityGestureRecognizer::~ProximityGestureRecognizer() {
    if (isRunning()) {
        stop();
    }
}

bool ProximityGestureRecognizer::addGesture(const std::string& name, const std::string& timeline) {
    if (!ProximityGesture::isValidTimeline(timeline)) {
        Logger::log(Logger::Error,
                    "ProximityGestureRecognizer: gesture \"%s\" is not added - invalid timeline \"%s\"",
                    name.c_str(), timeline.c_str());
        return false;
    }
    return addGesture(boost::make_shared<ProximityGesture>(name, timeline));
}

bool ProximityGestureRecognizer::addGesture(const boost::shared_ptr<ProximityGesture>& gesture) {
    if (!gesture || !gesture->isValid()) {
        Logger::log(Logger::Error, "ProximityGestureRecognizer: gesture \"%s\" is not added - invalid timeline",
                    gesture ? gesture->getName().c_str() : "");
        return false;
    }
    // Only the last maxPeriods periods are kept: a longer gesture could never
    // be recognized.
    if (gesture->getLength() > maxPeriods) {
        Logger::log(Logger::Error,
                    "ProximityGestureRecognizer: gesture \"%s\" is not added - more than %u periods",
                    gesture->getName().c_str(), maxPeriods);
        return false;
    }
    boost::shared_ptr<ProximityGesture> collision = findCollision(gesture);
    if (collision) {
        Logger::log(Logger::Warning,
                    "ProximityGestureRecognizer: warning - gesture \"%s\" is not added - collision with \"%s\"",
                    gesture->getName().c_str(), collision->getName().c_str());
        return false;
    }
    gestures.push_back(gesture);
    Logger::log(Logger::Info, "ProximityGestureRecognizer: gesture \"%s\" added", gesture->getName().c_str());
    return true;
}

boost::shared_ptr<ProximityGesture> ProximityGestureRecognizer::findCollision(
    const boost::shared_ptr<ProximityGesture>& gesture) const {
    if (gesture) {
        for (const boost::shared_ptr<ProximityGesture>& registered : gestures) {
            if (gesture->isCollisionPossible(registered) || registered->isCollisionPossible(gesture)) {
                return registered;
            }
        }
    }
    return boost::shared_ptr<ProximityGesture>();
}

void ProximityGestureRecognizer::setCallback(const callback<void (*)(const std::string&)>& newOnGesture) {
    onGesture = newOnGesture;
}

void ProximityGestureRecognizer::start() {
    if (isRunning()) {
        Logger::log(Logger::Error,
                    "ProximityGestureRecognizer: failure to start: the service is already running.");
        return;
    }
    if (gestures.empty()) {
        Logger::log(Logger::Error,
                    "ProximityGestureRecognizer: failure to start: you should add the gestures first.");
        return;
    }
    Logger::log(Logger::Info, "ProximityGestureRecognizer: Setting up proximity sensor callback");
    kdInstallCallback(&ProximityGestureRecognizer::proximityCallback, KD_EVENT_PROXIMITY_ZVR, this);
    listener = kdStartListeningProximityEventsZVR(this);
    if (listener == 0) {
        Logger::log(Logger::Error, "ProximityGestureRecognizer: the platform refused the proximity sensor");
        kdInstallCallback(nullptr, KD_EVENT_PROXIMITY_ZVR, this);
    }
}

void ProximityGestureRecognizer::stop() {
    if (!isRunning()) {
        Logger::log(Logger::Error, "ProximityGestureRecognizer: failure to stop: the service is not running.");
        return;
    }
    Logger::log(Logger::Info, "ProximityGestureRecognizer: Unsetting proximity sensor callback");
    kdStopListeningProximityEventsZVR(listener);
    kdInstallCallback(nullptr, KD_EVENT_PROXIMITY_ZVR, this);
    listener = 0;
    periods.clear();
}

void ProximityGestureRecognizer::onSensorEvent(bool value) {
    // The platform reports the state the sensor has just entered, so the
    // period that ended was covered exactly when it is now uncovered.
    lastPeriodCovered = !value;
    const long long now = static_cast<long long>(kdGetTimeUST());
    const long long elapsed = (now - lastEventTime) / kNanosecondsPerMillisecond;
    if (elapsed < minPeriod) {
        // Flicker: the blip and the change before it cancel out, and the
        // period before them goes on.
        if (!periods.empty()) {
            lastEventTime -= periods.back() * kNanosecondsPerMillisecond;
            periods.pop_back();
        }
        return;
    }
    lastEventTime = now;
    // A month without a change is as long a pause as any.
    periods.push_back(elapsed > INT_MAX ? INT_MAX : static_cast<int>(elapsed));
    if (periods.size() > maxPeriods) {
        periods.pop_front();
    }
    testGestures();
}

void ProximityGestureRecognizer::proximityCallback(const KDEvent* event) {
    ProximityGestureRecognizer* self = static_cast<ProximityGestureRecognizer*>(event->userptr);
    if (self != nullptr) {
        self->onSensorEvent(event->data.words[0] != 0);
    }
}

// On a tie the earlier gesture stays; a better score wins over a longer
// gesture only while the best so far does not match at all.
void ProximityGestureRecognizer::testGestures() {
    if (gestures.empty()) {
        return;
    }
    std::list<boost::shared_ptr<ProximityGesture> >::const_iterator it = gestures.begin();
    boost::shared_ptr<ProximityGesture> best = *it;
    float bestScore = best->compare(periods, lastPeriodCovered);
    for (++it; it != gestures.end(); ++it) {
        const float score = (*it)->compare(periods, lastPeriodCovered);
        if (score > bestScore && (bestScore < 0.0f || best->getLength() <= (*it)->getLength())) {
            best = *it;
            bestScore = score;
        }
    }
    if (bestScore > 0.0f) {
        // Cleared first: the callback may stop or even destroy the recognizer.
        periods.clear();
        onGesture(best->getName());
    }
}

}  // namespace Sensor
