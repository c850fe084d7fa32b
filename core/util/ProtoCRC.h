#pragma once

namespace Util {

// The checksum of scrambled protobuf payloads. Any thread.
class ProtoCRC {
public:
    // XORs buffer in place with key repeated (an empty or null key leaves it as it is), then
    // returns the standard CRC-32 of the result. A length of 0 or less returns 0.
    static int calcBufferCRC(char* buffer, int length, const char* key);
};

}  // namespace Util
