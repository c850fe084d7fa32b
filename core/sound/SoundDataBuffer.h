#pragma once

#include <vector>

#include "sound/SoundDataInfo.h"

namespace Sound {

// Sound data: raw PCM interleaved by channel (16-bit samples little-endian)
// or encoded bytes, as info says. Shared through boost::shared_ptr; used by
// one thread at a time.
struct SoundDataBuffer {
    SoundDataInfo info;
    std::vector<unsigned char> data;
};

}  // namespace Sound
