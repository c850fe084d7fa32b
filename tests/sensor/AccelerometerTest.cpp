// The accelerometer singleton fed by the simulated sensor on the main thread.
#include <pal/Simulation.h>

#include <functional>
#include <memory>
#include <vector>

#include "sensor/Accelerometer.h"
#include "support/PalTest.h"

namespace {

using Sensors::Acceleration;
using Sensors::Accelerometer;

class RecordingListener : public Sensors::AccelerometerListener {
public:
    void onAccelerationChanged(Accelerometer* accelerometer,
                               const boost::shared_ptr<Acceleration>& acceleration) override {
        senders.push_back(accelerometer);
        samples.push_back(acceleration);
        if (action) {
            action();
        }
    }

    std::vector<Accelerometer*> senders;
    std::vector<boost::shared_ptr<Acceleration> > samples;
    std::function<void()> action;
};

class AccelerometerTest : public PalTest {
protected:
    Accelerometer* accelerometer() { return Accelerometer::getInstance(); }
    void inject(float x, float y, float z) {
        pal::injectAcceleration(x, y, z);
        pump();
    }
    // Every sample handed back to the platform, none of them twice.
    void expectRecordsReleasedOnce() {
        EXPECT_EQ(0, pal::undismissedAccelerations());
        EXPECT_EQ(0, countLogLines("already dismissed"));
    }
};

}  // namespace

TEST_F(AccelerometerTest, SensorRunsWhileListenersAreRegisteredAndTheyShareOneSample) {
    RecordingListener first;
    RecordingListener second;
    accelerometer()->setUpdateInterval(0.05f);
    EXPECT_TRUE(pal::isAccelerometerAcquired());
    EXPECT_FLOAT_EQ(0.05f, pal::accelerometerInterval());
    EXPECT_FALSE(pal::isAccelerometerEnabled());

    accelerometer()->addAccelerometerListener(&first);
    accelerometer()->addAccelerometerListener(&second);
    EXPECT_TRUE(pal::isAccelerometerEnabled());
    advanceMs(5);
    const long long injectedAt = static_cast<long long>(kdGetTimeUST());
    inject(0.5f, -9.81f, 1.25f);
    ASSERT_EQ(1u, first.samples.size());
    ASSERT_EQ(1u, second.samples.size());
    EXPECT_EQ(first.samples[0], second.samples[0]);
    EXPECT_EQ(accelerometer(), first.senders[0]);
    EXPECT_FLOAT_EQ(0.5f, first.samples[0]->getX());
    EXPECT_FLOAT_EQ(-9.81f, first.samples[0]->getY());
    EXPECT_FLOAT_EQ(1.25f, first.samples[0]->getZ());
    EXPECT_EQ(injectedAt, first.samples[0]->getTimestamp());
    expectRecordsReleasedOnce();

    accelerometer()->addAccelerometerListener(&first);
    expectAssertion("find(listeners.begin(), listeners.end(), listener) == listeners.end()");
    accelerometer()->removeAccelerometerListener(&first);
    EXPECT_TRUE(pal::isAccelerometerEnabled());
    accelerometer()->removeAccelerometerListener(&first);
    expectAssertion("it != listeners.end()");
    accelerometer()->removeAccelerometerListener(&second);
    EXPECT_FALSE(pal::isAccelerometerEnabled());
    inject(1.0f, 1.0f, 1.0f);
    EXPECT_EQ(1u, second.samples.size());
}

TEST_F(AccelerometerTest, ListenersAddedRemovedOrDestroyedDuringASampleAreHandledFromTheNextOne) {
    RecordingListener remover;
    RecordingListener killer;
    std::unique_ptr<RecordingListener> victim(new RecordingListener());
    RecordingListener adder;
    RecordingListener added;
    remover.action = [&] { accelerometer()->removeAccelerometerListener(&remover); };
    killer.action = [&] { victim.reset(); };
    adder.action = [&] {
        if (!accelerometer()->isRegistered(&added)) {
            accelerometer()->addAccelerometerListener(&added);
        }
    };
    for (RecordingListener* listener : {&remover, &killer, victim.get(), &adder}) {
        accelerometer()->addAccelerometerListener(listener);
    }

    inject(1.0f, 2.0f, 3.0f);
    inject(4.0f, 5.0f, 6.0f);

    EXPECT_EQ(1u, remover.samples.size());
    EXPECT_EQ(2u, killer.samples.size());
    EXPECT_EQ(2u, adder.samples.size());
    ASSERT_EQ(1u, added.samples.size());
    EXPECT_FLOAT_EQ(4.0f, added.samples[0]->getX());
    expectRecordsReleasedOnce();
}

TEST_F(AccelerometerTest, LastListenerLeavingInsideItsCallbackStopsTheSensorAndTheRecordGoesBackOnce) {
    RecordingListener leaving;
    leaving.action = [&] { accelerometer()->removeAccelerometerListener(&leaving); };
    accelerometer()->addAccelerometerListener(&leaving);
    inject(1.0f, 0.0f, 0.0f);
    EXPECT_EQ(1u, leaving.samples.size());
    EXPECT_FALSE(pal::isAccelerometerEnabled());
    expectRecordsReleasedOnce();

    {
        RecordingListener expired;
        accelerometer()->addAccelerometerListener(&expired);
    }
    EXPECT_FALSE(pal::isAccelerometerEnabled());
    inject(1.0f, 0.0f, 0.0f);
    expectRecordsReleasedOnce();
}

TEST_F(AccelerometerTest, SampleWithoutRecordIsIgnoredWithALogLine) {
    RecordingListener listener;
    accelerometer()->addAccelerometerListener(&listener);
    KDEvent event{};
    event.type = KD_EVENT_ACCELEROMETER_ZVR;
    event.userptr = accelerometer();
    pal::postToMain(event);
    pump();
    EXPECT_TRUE(listener.samples.empty());
    EXPECT_TRUE(hasLogLine("Accelerometer: sample without data ignored"));
}

TEST_F(AccelerometerTest, TeardownWithSamplesQueuedHandsThemBackAndReleasesTheSensor) {
    RecordingListener listener;
    accelerometer()->addAccelerometerListener(&listener);
    pal::injectAcceleration(1.0f, 2.0f, 3.0f);
    pal::injectAcceleration(4.0f, 5.0f, 6.0f);
    shutdownPal();
    EXPECT_TRUE(listener.samples.empty());
    EXPECT_FALSE(pal::isAccelerometerAcquired());
    EXPECT_EQ(0, pal::undismissedAccelerations());
}
