// Base64 text from answers through Base64Coder::decode, and the promise that decoding undoes
// encoding for any bytes.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "util/Base64Coder.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const std::string text(reinterpret_cast<const char*>(data), size);
    std::vector<unsigned char> decoded;
    Util::Base64Coder::decode(text, decoded);
    fuzz::check(decoded.size() <= size / 4 * 3, "at most 3 bytes per 4 characters");

    const std::vector<unsigned char> bytes(data, data + size);
    std::string encoded;
    Util::Base64Coder::encode(bytes, encoded);
    std::vector<unsigned char> roundTrip;
    Util::Base64Coder::decode(encoded, roundTrip);
    fuzz::check(roundTrip == bytes, "decoding undoes encoding");
    return 0;
}
