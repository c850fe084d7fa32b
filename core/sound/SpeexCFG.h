#pragma once

namespace Sound {

// Speex settings shared by every OggSpeexEncoder, read when an encoder is
// constructed. Set them on the thread that creates encoders.
class SpeexCFG {
public:
    // -1: the encoder's own quality is used.
    static int quality;
    static float vbrQuality;
    // Bits per second; -1: not set.
    static int bitRate;
    static int complexity;
    // -1 or positive; -1 makes every frame a packet of its own.
    static int numFramesPerPacket;
    static bool highPassEnabled;
    static bool vbrEnabled;
    static int vbrMax;
    static bool abrEnabled;
    static bool vadEnabled;
    static bool dtxEnabled;
};

}  // namespace Sound
