#pragma once

namespace Simulator {

// Implemented by the application to replace or record the satellite input of
// the location manager (LocationManager::setSimulator). Called on the main
// thread for every satellite fix while the satellite provider is enabled.
class AbstractSimulator {
public:
    virtual ~AbstractSimulator() {}
    // True: fixes from the real receiver are ignored; only simulated fixes
    // (events with timestamp -1) count.
    virtual bool isReplaying() = 0;
    // True: every fix that counts is passed to recordLocation first.
    virtual bool isRecording() = 0;
    virtual void recordLocation(float latitude, float longitude, float speed, float bearing, float accuracy,
                                float altitude, int precision) = 0;
};

}  // namespace Simulator
