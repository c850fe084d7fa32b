#pragma once

#include <string>

namespace IO {

// Sink of bytes with little-endian writers for the binary encoding shared with InputStream.
// Not thread-safe: one thread uses a stream at a time.
class OutputStream {
public:
    virtual ~OutputStream();

    // Returns the number of bytes written.
    virtual int write(const void* data, int length) = 0;

    void writeBool(bool value);
    void writeUByte(unsigned char value);
    void writeByte(signed char value);
    void writeShort(short value);
    void writeInt(int value);
    void writeLongLong(long long value);
    void writeULongLong(unsigned long long value);
    void writeFloat(float value);
    // Int length, then the bytes.
    void writeString(const std::string& value);
    // UByte length, then the bytes; the caller keeps value within 255 bytes.
    void writeNString(const std::string& value);
    // The bytes, then one zero byte.
    void writeZString(const std::string& value);

private:
    void writeLittleEndian(unsigned long long value, int width);
};

}  // namespace IO
