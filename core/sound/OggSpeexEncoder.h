#pragma once

#include <ogg/ogg.h>
#include <speex/speex.h>
#include <speex/speex_header.h>
#include <speex/speex_stereo.h>

#include <vector>

#include "sound/Encoder.h"

namespace Sound {

// Encodes 8, 16 or 32 kHz PCM (1- or 2-byte samples, one or two channels) to
// an Ogg Speex stream held in memory, with the settings of SpeexCFG taken at
// construction. An encoder for any other rate, sample size or channel count
// is unusable and produces nothing.
//
// The last packet carries the end-of-stream flag, as Ogg requires and
// decoders rely on to trim the last frame to the stream's length, so each
// packet is held back until the next one is ready or closeWrite() comes. A
// recording shorter than one frame is padded with silence to one frame, so
// that it too ends with the flag; its granule still counts only what was
// recorded. A trailing part frame after whole ones is dropped.
//
// Threads: one thread at a time.
class OggSpeexEncoder : public Encoder {
public:
    static constexpr unsigned int PAGE_FILL_BYTES_DFLT = 4096;

    // quality 0..10.
    OggSpeexEncoder(const SoundDataInfo& anInfo, int aQuality,
                    unsigned int pageFillBytes = PAGE_FILL_BYTES_DFLT);
    ~OggSpeexEncoder() override;

    void write(const SoundDataBuffer& aBuffer) override;
    boost::shared_ptr<SoundDataBuffer> read(int maxBytes) override;
    void closeWrite() override;

    bool isInitialized() const { return initialized; }
    int getFrameSize() const { return frameSize; }
    int getLookahead() const { return lookahead; }
    // Packets handed to the Ogg stream so far, the two headers included.
    long long getPacketCount() const { return packetCount; }

private:
    OggSpeexEncoder(const OggSpeexEncoder&) = delete;
    OggSpeexEncoder& operator=(const OggSpeexEncoder&) = delete;

    bool init();
    void configureEncoder();
    void writeHeader();
    size_t getFrameBytes() const;
    void encodeFrame(const unsigned char* bytes);
    // Encodes what input is pending, less than a frame, as one frame.
    void encodePaddedFrame();
    void emitPacket();
    void submitHeldPacket(bool endOfStream);
    void appendPage(const ogg_page& page);

    SoundDataInfo info;
    int quality;
    int frameSize = 0;
    int lookahead = 0;
    bool littleEndian = true;
    bool initialized = false;
    unsigned int pageFillBytes;
    ogg_stream_state stream;
    SpeexHeader header;
    void* state = nullptr;
    SpeexBits bits;
    int framesPerPacket = 1;
    long long frameCount = 0;
    long long totalSamples = 0;
    long long bytesWritten = 0;
    long long packetCount = 0;
    std::vector<unsigned char> pendingInput;
    std::vector<unsigned char> output;
    // The last packet, waiting to learn whether it ends the stream.
    std::vector<unsigned char> heldPacket;
    long long heldGranule = 0;
    bool packetHeld = false;
    bool closed = false;
};

}  // namespace Sound
