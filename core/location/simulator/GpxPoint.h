#pragma once

#include <KD/kd.h>

namespace Simulator {

// One track point of a GPX track as the simulator replays or records it.
// Optional values are -1 when the file does not carry them. Value type.
struct GpxPoint {
    float latitude;
    float longitude;
    float altitude;  // <ele>
    float speed;     // metres per second
    float course;    // degrees clockwise from north
    float accuracy;  // metres
    int precision;
    // Milliseconds since 1970-01-01 UTC; -1 when the point has no <time>.
    KDint64 timeMs;
};

}  // namespace Simulator
