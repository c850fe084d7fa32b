#include "util/ProtobufStreamCallbacks.h"

#include <KD/kd.h>

#include <climits>

#include "io/BoundedReader.h"
#include "io/InputStream.h"

namespace Util {

ProtobufStreamCallbacks::ProtobufStreamCallbacks(IO::InputStream* stream) {
    KD_ASSERT(stream);
    if (!stream) {
        return;
    }
    // Grows with what arrives, not with what available() claims; positions are ints.
    std::vector<char> bytes;
    if (IO::BoundedReader::readAll(*stream, INT_MAX, bytes) == IO::BoundedReader::TooLong) {
        bytes.resize(INT_MAX);
    }
    buffer.assign(bytes.begin(), bytes.end());
}

bool ProtobufStreamCallbacks::Next(const void** data, int* size) {
    KD_ASSERT(data);
    KD_ASSERT(size);
    const int left = static_cast<int>(buffer.size()) - position;
    if (!data || !size || left <= 0) {
        lastReturnedSize = 0;
        return false;
    }
    *data = buffer.data() + position;
    *size = left;
    lastReturnedSize = left;
    position += left;
    return true;
}

void ProtobufStreamCallbacks::BackUp(int count) {
    KD_ASSERT(lastReturnedSize != 0);
    KD_ASSERT(count <= lastReturnedSize);
    if (count >= 0 && count <= lastReturnedSize) {
        position -= count;
    }
    lastReturnedSize = 0;
}

bool ProtobufStreamCallbacks::Skip(int count) {
    KD_ASSERT(count > 0);
    lastReturnedSize = 0;
    if (count < 0) {
        return false;
    }
    const int left = static_cast<int>(buffer.size()) - position;
    if (count > left) {
        position = static_cast<int>(buffer.size());
        return false;
    }
    position += count;
    return true;
}

int64_t ProtobufStreamCallbacks::ByteCount() const {
    return position;
}

}  // namespace Util
