// The recognizer fed by the simulated proximity sensor on the virtual clock.
#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "sensor/proximity/ProximityGestureRecognizer.h"
#include "support/PalTest.h"

namespace {

using Sensor::ProximityGesture;
using Sensor::ProximityGestureRecognizer;
typedef std::vector<std::string> Names;
// Milliseconds each state lasts, starting covered and alternating.
typedef std::vector<int> Rhythm;

const int kPauseMs = 1600;

class ProximityGestureRecognizerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        recognizer.reset(new ProximityGestureRecognizer());
        recognizer->setCallback(
            callback<void (*)(const std::string&)>::make<ProximityGestureRecognizerTest,
                                                         &ProximityGestureRecognizerTest::onGesture>(this));
    }
    void TearDown() override {
        recognizer.reset();
        PalTest::TearDown();
    }

    void onGesture(const std::string& name) {
        recognized.push_back(name);
        if (destroyOnGesture) {
            recognizer.reset();
        }
    }

    void startWithWaveAndHold() {
        ASSERT_TRUE(recognizer->addGesture("wave", "*-*"));
        ASSERT_TRUE(recognizer->addGesture("hold", "******"));
        recognizer->start();
    }
    void change(bool covered, int afterMs) {
        advanceMs(afterMs);
        pal::injectProximity(covered);
        pump();
    }
    // Uncovered for pauseMs, then the rhythm; ends uncovered.
    void perform(const Rhythm& rhythm, int pauseMs = kPauseMs) {
        bool covered = true;
        change(covered, pauseMs);
        for (int ms : rhythm) {
            covered = !covered;
            change(covered, ms);
        }
    }

    std::unique_ptr<ProximityGestureRecognizer> recognizer;
    Names recognized;
    bool destroyOnGesture = false;
};

}  // namespace

TEST_F(ProximityGestureRecognizerTest, RecognizesEachGestureWithJitterInsideTheToleranceOnly) {
    startWithWaveAndHold();
    const std::pair<Rhythm, const char*> cases[] = {
        {{150, 150, 150}, "wave"}, {{210, 90, 200}, "wave"}, {{150, 230, 150}, nullptr},
        {{900}, "hold"},           {{1300}, "hold"},         {{1400}, nullptr},
        {{400}, nullptr},
    };
    for (const auto& c : cases) {
        recognized.clear();
        perform(c.first);
        EXPECT_EQ(c.second != nullptr ? Names{c.second} : Names(), recognized) << ::testing::PrintToString(c.first);
        if (c.second != nullptr) {
            EXPECT_TRUE(recognizer->getPeriods().empty());
        }
    }
}

TEST_F(ProximityGestureRecognizerTest, GestureCountsOnlyAfterAPauseOfMoreThan1500Ms) {
    startWithWaveAndHold();
    perform({150, 150, 150}, 1000);
    perform({900}, 1400);
    EXPECT_TRUE(recognized.empty());
    perform({900}, 1550);
    EXPECT_EQ(Names{"hold"}, recognized);
}

TEST_F(ProximityGestureRecognizerTest, FlickerShorterThan50MsCancelsOut) {
    startWithWaveAndHold();
    change(true, kPauseMs);
    change(false, 400);
    change(true, 30);
    change(false, 470);
    EXPECT_EQ(Names{"hold"}, recognized);

    // A blip with nothing observed before it is simply dropped.
    change(true, 20);
    EXPECT_TRUE(recognizer->getPeriods().empty());
}

TEST_F(ProximityGestureRecognizerTest, KeepsTheLastTenPeriods) {
    startWithWaveAndHold();
    perform({60, 60, 60, 60, 60, 60, 60, 60, 60, 60, 60, 60});
    EXPECT_EQ(10u, recognizer->getPeriods().size());
    EXPECT_TRUE(recognized.empty());
}

TEST_F(ProximityGestureRecognizerTest, RefusesCollidingAndInvalidGesturesWithALogLine) {
    EXPECT_TRUE(recognizer->addGesture("short", "*-*"));
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: gesture \"short\" added"));
    EXPECT_FALSE(recognizer->addGesture("long", "*-*-*"));
    EXPECT_TRUE(hasLogLine(
        "ProximityGestureRecognizer: warning - gesture \"long\" is not added - collision with \"short\""));
    EXPECT_EQ("short", recognizer->findCollision(boost::make_shared<ProximityGesture>("x", "*-*-*"))->getName());
    EXPECT_FALSE(recognizer->findCollision(boost::make_shared<ProximityGesture>("x", "******")));

    EXPECT_FALSE(recognizer->addGesture("empty", ""));
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: gesture \"empty\" is not added - invalid timeline \"\""));
    EXPECT_FALSE(recognizer->addGesture("letters", "*a-"));
    EXPECT_TRUE(
        hasLogLine("ProximityGestureRecognizer: gesture \"letters\" is not added - invalid timeline \"*a-\""));
    EXPECT_FALSE(recognizer->addGesture(boost::shared_ptr<ProximityGesture>()));
    EXPECT_FALSE(recognizer->addGesture("eleven", "*-*-*-*-*-*"));
    EXPECT_TRUE(
        hasLogLine("ProximityGestureRecognizer: gesture \"eleven\" is not added - more than 10 periods"));

    recognizer->start();
    perform({150, 150, 150});
    EXPECT_EQ(Names{"short"}, recognized);
}

TEST_F(ProximityGestureRecognizerTest, StartAndStopMisuseIsLoggedAndHarmless) {
    recognizer->stop();
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: failure to stop: the service is not running."));
    recognizer->start();
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: failure to start: you should add the gestures first."));
    EXPECT_EQ(0, pal::proximityListeners());

    startWithWaveAndHold();
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: Setting up proximity sensor callback"));
    recognizer->start();
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: failure to start: the service is already running."));
    EXPECT_EQ(1, pal::proximityListeners());
    change(true, kPauseMs);
    recognizer->stop();
    EXPECT_TRUE(hasLogLine("ProximityGestureRecognizer: Unsetting proximity sensor callback"));
    EXPECT_EQ(0, pal::proximityListeners());
    EXPECT_TRUE(recognizer->getPeriods().empty());

    recognizer->start();
    recognizer.reset();
    EXPECT_EQ(0, pal::proximityListeners());
}

TEST_F(ProximityGestureRecognizerTest, CallbackMayDestroyTheRecognizer) {
    startWithWaveAndHold();
    destroyOnGesture = true;
    perform({900});
    EXPECT_EQ(Names{"hold"}, recognized);
    EXPECT_FALSE(recognizer);
    EXPECT_EQ(0, pal::proximityListeners());
}
