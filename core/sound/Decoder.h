#pragma once

namespace Sound {

// Turns encoded sound into PCM in one call.
class Decoder {
public:
    virtual ~Decoder() = default;
    // True when the whole input was decoded.
    virtual bool decode() = 0;
};

}  // namespace Sound
