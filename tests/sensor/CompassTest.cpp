#include <pal/Simulation.h>

#include <memory>
#include <vector>

#include "sensor/Compass.h"
#include "support/PalTest.h"

namespace {

struct Readings {
    void record(int azimuth) { values.push_back(azimuth); }
    callback<void (*)(int)> reporter() { return callback<void (*)(int)>::make<Readings, &Readings::record>(this); }
    std::vector<int> values;
};

class CompassTest : public PalTest {
protected:
    void inject(int azimuth) {
        pal::injectCompass(azimuth);
        pump();
    }
};

}  // namespace

TEST_F(CompassTest, ReportsEveryAzimuthToTheLatestCallbackUntilCancelled) {
    Readings first;
    Readings second;
    Sensor::Compass compass;
    compass.start(first.reporter());
    inject(90);
    inject(91);
    compass.start(second.reporter());
    EXPECT_EQ(1, pal::compassListeners());
    inject(180);
    compass.cancel();
    compass.cancel();
    inject(270);

    EXPECT_EQ((std::vector<int>{90, 91}), first.values);
    EXPECT_EQ((std::vector<int>{180}), second.values);
    EXPECT_FALSE(compass.isStarted());
    EXPECT_EQ(0, pal::compassListeners());
}

TEST_F(CompassTest, DestroyedCompassGetsNoReportStillQueued) {
    Readings readings;
    std::unique_ptr<Sensor::Compass> compass(new Sensor::Compass());
    compass->start(readings.reporter());
    pal::injectCompass(45);
    compass.reset();
    pump();
    EXPECT_TRUE(readings.values.empty());
    EXPECT_EQ(0, pal::compassListeners());
}
