#pragma once

#include <KD/kd.h>

#include <string>

namespace IO {

// Source of bytes with little-endian readers for the binary encoding shared with OutputStream.
// Not thread-safe: one thread uses a stream at a time.
class InputStream {
public:
    virtual ~InputStream();

    // After this, a read that cannot deliver what was asked throws IO::Exception instead of
    // reporting an assertion failure.
    virtual void enableExceptions();

    virtual long long available() = 0;
    // Delivers up to length bytes; see each implementation for what a short read does.
    virtual int read(void* buffer, int length) = 0;
    virtual long long tell() = 0;
    virtual void seek(long long offset, KDfileSeekOrigin origin) = 0;

    bool readBool();
    unsigned char readUByte();
    signed char readByte();
    short readShort();
    int readInt();
    long long readLongLong();
    unsigned long long readULongLong();
    float readFloat();

    // Int length, then the bytes. False when fewer than 4 bytes are left or the bytes are
    // missing (the string is then left empty).
    bool readString(std::string& out);
    // UByte length, then the bytes.
    bool readNString(std::string& out);
    // Bytes up to a zero byte.
    bool readZString(std::string& out);
    // Bytes up to a line feed (consumed, not stored); carriage returns are dropped. The end of
    // the data also ends the line.
    bool readCRLFString(std::string& out);

protected:
    // Every implementation calls this when a read cannot deliver what was asked.
    void handleBadState();

    bool exceptionsEnabled = false;

private:
    // Reads exactly width bytes; a short read leaves them zero.
    void readFixed(unsigned char* bytes, int width);
    unsigned long long readLittleEndian(int width);
};

}  // namespace IO
