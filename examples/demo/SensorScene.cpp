// Sensors: a few accelerometer samples and compass readings from the
// simulated device, then a scripted hand over the proximity sensor that knocks
// once, holds once with a flicker in the middle, and is recognized both times.
// The script runs on the demo's real clock, with rhythms well inside the
// recognizer's tolerance.

#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <cstddef>

#include "DemoScene.h"
#include "sensor/Accelerometer.h"
#include "sensor/Compass.h"
#include "sensor/proximity/ProximityGestureRecognizer.h"
#include "util/Timer.h"

namespace {

// What the hand does, and how long after the step before.
enum Move { Cover, Uncover, Flicker, Finish };
struct Step {
    int afterMs;
    Move move;
    const char* note;
};

// The recognizer measures from its creation, which counts as the pause
// before the first gesture.
const Step kScript[] = {
    {1700, Cover, "knock: cover"},
    {300, Uncover, "knock: uncover"},
    {300, Cover, "knock: cover"},
    {300, Uncover, "knock: uncover"},
    {1700, Cover, "hold: cover"},
    {400, Flicker, "hold: a flicker of the sensor (uncovered and covered again at once)"},
    {500, Uncover, "hold: uncover after 900 ms"},
    {100, Finish, nullptr},
};

// Main thread only.
class SensorScene : public DemoScene, public Sensors::AccelerometerListener {
public:
    SensorScene() : step(0), timer(callback<void (*)()>::make<SensorScene, &SensorScene::nextStep>(this)) {}

    void run(Done done) override {
        finished = done;
        showMotionSensors();
        recognizer.setCallback(
            callback<void (*)(const std::string&)>::make<SensorScene, &SensorScene::onGesture>(this));
        addGesture("knock", "**--**");
        addGesture("hold", "******");
        addGesture("tap", "**");
        recognizer.start();
        timer.start(Util::Timer::OneShot, kScript[0].afterMs * 1000000ll);
    }

    void onAccelerationChanged(Sensors::Accelerometer*, const boost::shared_ptr<Sensors::Acceleration>& a) override {
        demo::say("accelerometer: x %.2f, y %.2f, z %.2f", a->getX(), a->getY(), a->getZ());
    }

private:
    void showMotionSensors() {
        Sensors::Accelerometer* accelerometer = Sensors::Accelerometer::getInstance();
        accelerometer->setUpdateInterval(0.1f);
        accelerometer->addAccelerometerListener(this);
        demo::say("accelerometer on while a listener is registered: %s",
                  pal::isAccelerometerEnabled() ? "yes" : "no");
        pal::injectAcceleration(0.12f, 9.79f, 0.31f);
        pal::injectAcceleration(-0.40f, 9.60f, 1.05f);
        compass.start(callback<void (*)(int)>::make<SensorScene, &SensorScene::onAzimuth>(this));
        pal::injectCompass(90);
        pal::injectCompass(135);
    }

    void onAzimuth(int azimuth) {
        demo::say("compass: azimuth %d degrees", azimuth);
        if (azimuth == 135) {
            compass.cancel();
            Sensors::Accelerometer::getInstance()->removeAccelerometerListener(this);
            demo::say("compass cancelled, accelerometer off again: %s",
                      pal::isAccelerometerEnabled() ? "no" : "yes");
        }
    }

    void addGesture(const char* name, const char* timeline) {
        const bool added = recognizer.addGesture(name, timeline);
        demo::say("proximity gesture \"%s\" (%s): %s", name, timeline,
                  added ? "added" : "refused, it could be taken for one already added");
    }

    void nextStep() {
        const Step& current = kScript[step];
        if (current.note != nullptr) {
            demo::say("hand: %s", current.note);
        }
        switch (current.move) {
            case Cover:
                pal::injectProximity(true);
                break;
            case Uncover:
                pal::injectProximity(false);
                break;
            case Flicker:
                pal::injectProximity(false);
                pal::injectProximity(true);
                break;
            case Finish:
                recognizer.stop();
                demo::say("gestures recognized: %d of 2", recognizedCount);
                finished();
                return;
        }
        ++step;
        timer.start(Util::Timer::OneShot, kScript[step].afterMs * 1000000ll);
    }

    void onGesture(const std::string& name) {
        ++recognizedCount;
        demo::say("proximity gesture recognized: \"%s\"", name.c_str());
    }

    size_t step;
    int recognizedCount = 0;
    Util::Timer timer;
    Sensor::Compass compass;
    Sensor::ProximityGestureRecognizer recognizer;
    Done finished;
};

DemoSceneRegistration<SensorScene> registration("Sensors", 70);

}  // namespace
