#include "sound/Encoder.h"

namespace Sound {

boost::shared_ptr<SoundDataBuffer> encode(Encoder* encoder, const SoundDataBuffer& buffer) {
    encoder->write(buffer);
    encoder->closeWrite();
    return encoder->read(-1);
}

}  // namespace Sound
