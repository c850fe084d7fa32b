#pragma once

#include <boost/shared_ptr.hpp>

#include "sound/SoundDataBuffer.h"

namespace Sound {

// Turns PCM into an encoded stream held in memory: any number of write(),
// then closeWrite(), then read() the stream. Used by one thread at a time.
class Encoder {
public:
    virtual ~Encoder() = default;
    virtual void write(const SoundDataBuffer& buffer) = 0;
    // A new buffer with up to maxBytes bytes of the stream (all with -1);
    // the bytes returned leave the encoder.
    virtual boost::shared_ptr<SoundDataBuffer> read(int maxBytes) = 0;
    virtual void closeWrite() = 0;
};

// The whole encoded stream of one complete recording.
boost::shared_ptr<SoundDataBuffer> encode(Encoder* encoder, const SoundDataBuffer& buffer);

}  // namespace Sound
