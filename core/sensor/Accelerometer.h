#pragma once

#include <KD/kdext.h>

#include <boost/shared_ptr.hpp>
#include <vector>

#include "sensor/Acceleration.h"
#include "sensor/AccelerometerListener.h"
#include "util/Singleton.h"

namespace Sensors {

// The device's accelerometer, shared by the process: each platform sample
// becomes one Acceleration handed to every registered listener in order of
// registration, and the sensor runs only while a listener is registered.
// Thread that made the singleton (the main thread) only.
class Accelerometer : public Util::Singleton<Accelerometer> {
public:
    ~Accelerometer() override;

    // The first listener switches the sensor on. Registering one twice is an
    // assertion.
    void addAccelerometerListener(AccelerometerListener* listener);
    // Removing the last listener switches the sensor off. Removing one that is
    // not registered is an assertion.
    void removeAccelerometerListener(AccelerometerListener* listener);
    bool isRegistered(const AccelerometerListener* listener) const;
    // Seconds between samples, passed to the platform unchanged.
    void setUpdateInterval(float interval);

    static void onAccelerate(const KDEvent* event);

private:
    friend class Util::Singleton<Accelerometer>;

    Accelerometer();
    Accelerometer(const Accelerometer&) = delete;
    Accelerometer& operator=(const Accelerometer&) = delete;

    void dispatch(const boost::shared_ptr<Acceleration>& acceleration);

    std::vector<AccelerometerListener*> listeners;
    KDAccelerometerZVR* nativeAccelerometer;
};

}  // namespace Sensors
