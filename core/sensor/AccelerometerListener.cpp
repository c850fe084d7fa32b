#include "sensor/AccelerometerListener.h"

#include "sensor/Accelerometer.h"

namespace Sensors {

AccelerometerListener::~AccelerometerListener() {
    Accelerometer* accelerometer = Accelerometer::getExistingInstance();
    if (accelerometer != nullptr && accelerometer->isRegistered(this)) {
        accelerometer->removeAccelerometerListener(this);
    }
}

}  // namespace Sensors
