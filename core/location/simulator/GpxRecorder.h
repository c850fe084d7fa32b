#pragma once

#include <KD/kd.h>

#include <string>
#include <vector>

#include "location/AbstractSimulator.h"
#include "location/simulator/GpxPoint.h"

namespace Simulator {

// Records every satellite fix the location manager takes as a GPX 1.1 track
// point, timed in milliseconds on the platform's clock, with speed, course,
// accuracy and precision in <extensions>, which GpxReader reads back: a
// recorded drive replays through GpxPlayer. Set it as the manager's
// simulator; it does not replay. Main thread only.
class GpxRecorder : public AbstractSimulator {
public:
    GpxRecorder();

    bool isReplaying() override { return false; }
    bool isRecording() override { return true; }
    void recordLocation(float latitude, float longitude, float speed, float bearing, float accuracy,
                        float altitude, int precision) override;

    const std::vector<GpxPoint>& getPoints() const { return points; }
    std::string toGpx() const;
    // Writes toGpx() through the platform's file system; false on failure.
    bool save(const char* path) const;

private:
    KDint64 startWallMs;
    KDust startUst;
    std::vector<GpxPoint> points;
};

}  // namespace Simulator
