#pragma once

namespace Sound {

// Describes the samples of a sound buffer. A plain value.
class SoundDataInfo {
public:
    static constexpr int NONE = 0;
    static constexpr int OGG_SPEEX = 2;

    SoundDataInfo() = default;
    SoundDataInfo(int codec, int channelCount, int sampleRate, int sampleSize, int sampleCount)
        : codec(codec),
          channelCount(channelCount),
          sampleRate(sampleRate),
          sampleSize(sampleSize),
          sampleCount(sampleCount) {}

    int getCodec() const { return codec; }
    int getChannelCount() const { return channelCount; }
    // Hz.
    int getSampleRate() const { return sampleRate; }
    // Bytes per sample: 1 or 2.
    int getSampleSize() const { return sampleSize; }
    // Samples per channel; -1 when not known (encoded data).
    int getSampleCount() const { return sampleCount; }

private:
    int codec = NONE;
    int channelCount = 1;
    int sampleRate = 8000;
    int sampleSize = 2;
    int sampleCount = -1;
};

}  // namespace Sound
