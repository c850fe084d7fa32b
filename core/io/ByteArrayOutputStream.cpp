#include "io/ByteArrayOutputStream.h"

#include <KD/kd.h>

namespace IO {

ByteArrayOutputStream::ByteArrayOutputStream() {}

ByteArrayOutputStream::ByteArrayOutputStream(unsigned int size) : data(size) {}

int ByteArrayOutputStream::write(const void* bytes, int length) {
    if (length <= 0) {
        KD_ASSERT(length >= 0);
        return 0;
    }
    const unsigned char* begin = static_cast<const unsigned char*>(bytes);
    data.insert(data.end(), begin, begin + length);
    return length;
}

}  // namespace IO
