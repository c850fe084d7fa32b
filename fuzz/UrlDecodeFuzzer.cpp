// URL decoding of text from answers and links, and the promise that decoding undoes encoding.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "util/UrlCoder.h"
#include "util/UrlEncoding.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const std::string text(reinterpret_cast<const char*>(data), size);
    const std::string terminated = text.substr(0, text.find('\0'));

    // The exact room the decoder's contract asks for, so ASan sees any write past it.
    std::vector<char> out(terminated.size() + 1);
    const unsigned int length = Util::UrlDecode(terminated.c_str(), out.data());
    fuzz::check(length <= terminated.size(), "decoding never lengthens the text");
    fuzz::check(Util::UrlCoder::urlDecodeString(text) == std::string(out.data(), length),
                "the string wrapper decodes as UrlDecode does");
    fuzz::check(Util::UrlCoder::urlDecodeString(Util::UrlCoder::urlEncodeString(terminated)) == terminated,
                "decoding undoes encoding");
    return 0;
}
