// Ogg Vorbis files through OggVorbisDecoder. A decoded file yields whole
// 16-bit samples; a refused one leaves nothing behind in the output.
#include <cstddef>
#include <cstdint>

#include "FuzzSupport.h"
#include "sound/OggVorbisDecoder.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    Sound::SoundDataBuffer input;
    input.data.assign(data, data + size);
    Sound::SoundDataBuffer output;
    Sound::OggVorbisDecoder decoder(output, input);
    if (decoder.decode()) {
        fuzz::check(output.data.size() % 2 == 0, "decoded PCM holds whole 16-bit samples");
    } else {
        fuzz::check(output.data.empty(), "a refused file leaves the output empty");
    }
    return 0;
}
