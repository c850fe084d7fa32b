#pragma once

#include <KD/kd.h>

namespace Statistics {

// One block of response data of a measured request. Value type; any thread.
struct ChunkInfo {
    ChunkInfo() : size(0), time(0) {}
    ChunkInfo(long long size, KDust time) : size(size), time(time) {}

    long long size;
    // kdGetTimeUST() when the block arrived.
    KDust time;
};

}  // namespace Statistics
