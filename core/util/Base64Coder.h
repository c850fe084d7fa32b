#pragma once

#include <string>
#include <vector>

namespace Util {

// Base64 with the standard alphabet and "=" padding. Any thread.
class Base64Coder {
public:
    // out is replaced by the encoding: 4 characters per started group of 3 bytes.
    static void encode(const std::vector<unsigned char>& bytes, std::string& out);
    static void encode(const std::string& text, std::string& out);

    // out is replaced by the decoded bytes. Characters outside the alphabet (line breaks,
    // spaces) are skipped, and "<" ends the text, so Base64 inside XML decodes up to the next
    // tag. A trailing group of fewer than 4 symbols is dropped.
    static void decode(const std::string& text, std::vector<unsigned char>& out);

private:
    static void encode(const unsigned char* bytes, size_t length, std::string& out);
};

}  // namespace Util
