#pragma once

#include <vector>

#include "location/AbstractSimulator.h"
#include "location/simulator/GpxPoint.h"
#include "util/Timer.h"
#include "util/callback.h"

namespace Simulator {

// Replays a track as simulated satellite fixes (event 101 with timestamp -1)
// on the clock of the platform layer, virtual or real. Set it as the location
// manager's simulator: it replays, so real fixes are ignored meanwhile.
//
// Fixes follow each other as the track's times say (1 s apart without times),
// divided by the rate. A gap of more than 3 s of track time reports the
// satellite fix as lost (status 1) 3 s after the last point, and found again
// (status 2) with the next. Main thread only, like the location manager.
class GpxPlayer : public AbstractSimulator {
public:
    typedef callback<void (*)()> Finished;

    // rate: track seconds per clock second.
    explicit GpxPlayer(const std::vector<GpxPoint>& points, float rate = 1.0f);

    // Posts the first fix now; onFinished is called after the last.
    void start(Finished onFinished = Finished());
    void stop();
    bool isPlaying() const { return started; }
    // Fixes posted since the last start().
    size_t getPlayedCount() const { return next; }

    bool isReplaying() override { return true; }
    bool isRecording() override { return false; }
    void recordLocation(float, float, float, float, float, float, int) override {}

private:
    void onTimer();
    void playPoint();
    void scheduleAfter(KDint64 trackMs);
    KDint64 gapAfter(size_t index) const;

    std::vector<GpxPoint> points;
    float rate;
    Finished onFinished;
    Util::Timer timer;
    size_t next;
    bool started;
    bool fixLost;
};

}  // namespace Simulator
