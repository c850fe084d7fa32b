#pragma once

namespace Sensors {

// One accelerometer sample, shared by every listener of the event that
// carried it, hence immutable. Any thread.
class Acceleration {
public:
    // timestamp: the platform event's UST, in nanoseconds.
    Acceleration(float x, float y, float z, long long timestamp) : x(x), y(y), z(z), timestamp(timestamp) {}

    float getX() const { return x; }
    float getY() const { return y; }
    float getZ() const { return z; }
    long long getTimestamp() const { return timestamp; }

private:
    const float x;
    const float y;
    const float z;
    const long long timestamp;
};

}  // namespace Sensors
