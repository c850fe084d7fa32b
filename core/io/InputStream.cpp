#include "io/InputStream.h"

#include <cstring>
#include <vector>

#include "io/BoundedReader.h"
#include "io/Exception.h"
#include "util/Logger.h"

namespace IO {

InputStream::~InputStream() {}

void InputStream::enableExceptions() {
    exceptionsEnabled = true;
    Logger::log(Logger::Info, "Enabling exceptions for stream");
}

void InputStream::handleBadState() {
    if (exceptionsEnabled) {
        throw Exception();
    }
    KD_ASSERT(false);
}

void InputStream::readFixed(unsigned char* bytes, int width) {
    // Not every stream zero-fills on a short read (an inflating zip entry stops at its end),
    // so the value is cleared here whatever the stream did.
    if (read(bytes, width) != width) {
        std::memset(bytes, 0, width);
    }
}

unsigned long long InputStream::readLittleEndian(int width) {
    unsigned char bytes[8] = {};
    readFixed(bytes, width);
    unsigned long long value = 0;
    for (int i = width - 1; i >= 0; --i) {
        value = (value << 8) | bytes[i];
    }
    return value;
}

bool InputStream::readBool() {
    return readLittleEndian(1) != 0;
}

unsigned char InputStream::readUByte() {
    return static_cast<unsigned char>(readLittleEndian(1));
}

signed char InputStream::readByte() {
    return static_cast<signed char>(readLittleEndian(1));
}

short InputStream::readShort() {
    return static_cast<short>(readLittleEndian(2));
}

int InputStream::readInt() {
    return static_cast<int>(readLittleEndian(4));
}

long long InputStream::readLongLong() {
    return static_cast<long long>(readLittleEndian(8));
}

unsigned long long InputStream::readULongLong() {
    return readLittleEndian(8);
}

float InputStream::readFloat() {
    unsigned int bits = static_cast<unsigned int>(readLittleEndian(4));
    float value;
    std::memcpy(&value, &bits, sizeof(value));
    return value;
}

bool InputStream::readString(std::string& out) {
    if (available() < 4) {
        return false;
    }
    out.clear();
    int length = readInt();
    if (length < 1) {
        return true;
    }
    // A corrupt length must not turn into a huge allocation: data that is not there is a
    // short read, reported before anything is allocated.
    if (length > available()) {
        handleBadState();
        return false;
    }
    // available() is only what the stream claims (a zip entry's header, say): the buffer grows
    // with the bytes that actually arrive.
    std::vector<char> bytes;
    if (!BoundedReader::readExactly(*this, static_cast<std::size_t>(length), bytes)) {
        return false;
    }
    out.assign(bytes.data(), bytes.size());
    return true;
}

bool InputStream::readNString(std::string& out) {
    if (available() < 1) {
        return false;
    }
    out.clear();
    int length = readUByte();
    if (length == 0) {
        return true;
    }
    char bytes[255];
    if (read(bytes, length) < length) {
        return false;
    }
    out.assign(bytes, length);
    return true;
}

bool InputStream::readZString(std::string& out) {
    if (available() < 1) {
        return false;
    }
    out.clear();
    for (signed char c = readByte(); c != 0; c = readByte()) {
        out.push_back(static_cast<char>(c));
    }
    return true;
}

bool InputStream::readCRLFString(std::string& out) {
    if (available() < 1) {
        return false;
    }
    out.clear();
    while (available() > 0) {
        // A stream that fails while still claiming data (a corrupt zip entry) must end the
        // line rather than loop on it.
        char c;
        if (read(&c, 1) != 1) {
            break;
        }
        if (c == '\n') {
            break;
        }
        if (c != '\r') {
            out.push_back(c);
        }
    }
    return true;
}

}  // namespace IO
