#include "io/OutputStream.h"

#include <KD/kd.h>

#include <cstring>

namespace IO {

OutputStream::~OutputStream() {}

void OutputStream::writeLittleEndian(unsigned long long value, int width) {
    unsigned char bytes[8];
    for (int i = 0; i < width; ++i) {
        bytes[i] = static_cast<unsigned char>(value >> (8 * i));
    }
    write(bytes, width);
}

void OutputStream::writeBool(bool value) {
    writeLittleEndian(value ? 1 : 0, 1);
}

void OutputStream::writeUByte(unsigned char value) {
    writeLittleEndian(value, 1);
}

void OutputStream::writeByte(signed char value) {
    writeLittleEndian(static_cast<unsigned char>(value), 1);
}

void OutputStream::writeShort(short value) {
    writeLittleEndian(static_cast<unsigned short>(value), 2);
}

void OutputStream::writeInt(int value) {
    writeLittleEndian(static_cast<unsigned int>(value), 4);
}

void OutputStream::writeLongLong(long long value) {
    writeLittleEndian(static_cast<unsigned long long>(value), 8);
}

void OutputStream::writeULongLong(unsigned long long value) {
    writeLittleEndian(value, 8);
}

void OutputStream::writeFloat(float value) {
    unsigned int bits;
    std::memcpy(&bits, &value, sizeof(bits));
    writeLittleEndian(bits, 4);
}

void OutputStream::writeString(const std::string& value) {
    int length = static_cast<int>(value.size());
    writeInt(length);
    if (length > 0) {
        write(value.data(), length);
    }
}

void OutputStream::writeNString(const std::string& value) {
    // The length has one byte. Writing more bytes than it can count would desynchronise every
    // later read of the data, so a longer string is cut to what the format holds.
    KD_ASSERT(value.size() <= 255);
    unsigned char length = static_cast<unsigned char>(value.size() > 255 ? 255 : value.size());
    writeUByte(length);
    if (length > 0) {
        write(value.data(), length);
    }
}

void OutputStream::writeZString(const std::string& value) {
    if (!value.empty()) {
        write(value.data(), static_cast<int>(value.size()));
    }
    writeUByte(0);
}

}  // namespace IO
