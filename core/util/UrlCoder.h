#pragma once

#include <string>

namespace Util {

// std::string wrappers of Util::UrlEncode and Util::UrlDecode. Text stops at an embedded zero
// byte. Any thread.
class UrlCoder {
public:
    static std::string urlEncodeString(const std::string& text);
    static std::string urlDecodeString(const std::string& text);
};

}  // namespace Util
