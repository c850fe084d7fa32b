#pragma once

#include <boost/shared_ptr.hpp>

#include "sensor/Acceleration.h"

namespace Sensors {

class Accelerometer;

// Receives the samples of the accelerometer it registered with, on that
// accelerometer's thread. A listener destroyed while still registered takes
// itself out, so the accelerometer never calls a dead one.
class AccelerometerListener {
public:
    virtual void onAccelerationChanged(Accelerometer* accelerometer,
                                       const boost::shared_ptr<Acceleration>& acceleration) = 0;

protected:
    virtual ~AccelerometerListener();
};

}  // namespace Sensors
