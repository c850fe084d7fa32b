#include "util/UrlCoder.h"

#include <vector>

#include "util/UrlEncoding.h"

namespace Util {

namespace {

// Most parameters are short; those are escaped without touching the heap.
const unsigned int kStackBufferSize = 64;

}  // namespace

std::string UrlCoder::urlEncodeString(const std::string& text) {
    const unsigned int size = 3 * (static_cast<unsigned int>(text.size()) + 1);
    if (size <= kStackBufferSize) {
        char buffer[kStackBufferSize];
        const unsigned int length = UrlEncode(text.c_str(), buffer, size);
        return std::string(buffer, length);
    }
    std::vector<char> buffer(size);
    const unsigned int length = UrlEncode(text.c_str(), buffer.data(), size);
    return std::string(buffer.data(), length);
}

std::string UrlCoder::urlDecodeString(const std::string& text) {
    std::vector<char> buffer(text.size() + 1);
    const unsigned int length = UrlDecode(text.c_str(), buffer.data());
    return std::string(buffer.data(), length);
}

}  // namespace Util
