#pragma once

#include <vorbis/vorbisfile.h>

#include <cstddef>

#include "sound/Decoder.h"
#include "sound/SoundDataBuffer.h"

namespace Sound {

// Decodes a complete Ogg Vorbis file held in memory into 16-bit little-endian
// PCM interleaved by channel. The caller owns both buffers and sets the
// output's info from its own knowledge of the file; decode() only fills the
// output's data.
//
// The output grows as samples are decoded, never by the length the file
// declares, and a file declaring more than kMaxDecodedBytes of PCM is
// refused: the declared length is untrusted and may be huge or negative.
//
// Threads: one thread at a time.
class OggVorbisDecoder : public Decoder {
public:
    static constexpr long long kMaxDecodedBytes = 64LL * 1024 * 1024;

    OggVorbisDecoder(SoundDataBuffer& output, const SoundDataBuffer& input);
    ~OggVorbisDecoder() override;

    // False when the input is not Ogg Vorbis (output untouched), and false
    // with empty output when it is damaged, truncated or too long.
    bool decode() override;

    // vorbisfile's callbacks over the in-memory source; source is the decoder.
    static size_t readOgg(void* ptr, size_t size, size_t count, void* source);
    static int seekOgg(void* source, ogg_int64_t offset, int whence);
    static int closeOgg(void* source);
    static long tellOgg(void* source);

private:
    OggVorbisDecoder(const OggVorbisDecoder&) = delete;
    OggVorbisDecoder& operator=(const OggVorbisDecoder&) = delete;

    bool openOggVorbisFile();
    bool readAll(long long blockSize);
    bool fail();
    void closeOggVorbisFile();

    SoundDataBuffer& output;
    const SoundDataBuffer& input;
    bool fileOpen = false;
    OggVorbis_File file;
    const unsigned char* sourceData = nullptr;
    size_t sourceSize = 0;
    size_t readPosition = 0;
};

}  // namespace Sound
