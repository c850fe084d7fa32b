#include "util/ProtoCRC.h"

#include <KD/kd.h>
#include <zlib.h>

namespace Util {

int ProtoCRC::calcBufferCRC(char* buffer, int length, const char* key) {
    if (length <= 0) {
        return 0;
    }
    const KDsize keyLength = key ? kdStrlen(key) : 0;
    if (keyLength > 0) {
        for (int i = 0; i < length; ++i) {
            buffer[i] = static_cast<char>(buffer[i] ^ key[i % keyLength]);
        }
    }
    // zlib's crc32 is the reflected 0xEDB88320 polynomial with all-ones start and final complement.
    const uLong crc = crc32(0L, reinterpret_cast<const Bytef*>(buffer), static_cast<uInt>(length));
    return static_cast<int>(static_cast<unsigned int>(crc));
}

}  // namespace Util
