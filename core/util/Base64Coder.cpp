#include "util/Base64Coder.h"

namespace Util {

namespace {

const char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// The 6-bit value of an alphabet character, or -1.
int symbolValue(char c) {
    if (c >= 'A' && c <= 'Z') {
        return c - 'A';
    }
    if (c >= 'a' && c <= 'z') {
        return c - 'a' + 26;
    }
    if (c >= '0' && c <= '9') {
        return c - '0' + 52;
    }
    if (c == '+') {
        return 62;
    }
    if (c == '/') {
        return 63;
    }
    return -1;
}

}  // namespace

void Base64Coder::encode(const std::vector<unsigned char>& bytes, std::string& out) {
    encode(bytes.data(), bytes.size(), out);
}

void Base64Coder::encode(const std::string& text, std::string& out) {
    encode(reinterpret_cast<const unsigned char*>(text.data()), text.size(), out);
}

void Base64Coder::encode(const unsigned char* bytes, size_t length, std::string& out) {
    out.clear();
    out.reserve((length + 2) / 3 * 4);
    for (size_t i = 0; i < length; i += 3) {
        const size_t groupLength = length - i < 3 ? length - i : 3;
        unsigned int group = bytes[i] << 16;
        if (groupLength > 1) {
            group |= bytes[i + 1] << 8;
        }
        if (groupLength > 2) {
            group |= bytes[i + 2];
        }
        out.push_back(kAlphabet[(group >> 18) & 0x3F]);
        out.push_back(kAlphabet[(group >> 12) & 0x3F]);
        out.push_back(groupLength > 1 ? kAlphabet[(group >> 6) & 0x3F] : '=');
        out.push_back(groupLength > 2 ? kAlphabet[group & 0x3F] : '=');
    }
}

void Base64Coder::decode(const std::string& text, std::vector<unsigned char>& out) {
    out.clear();
    out.reserve(text.size() / 4 * 3);
    unsigned int group = 0;
    int symbols = 0;
    int padding = 0;
    for (char c : text) {
        if (c == '<') {
            break;
        }
        int value = symbolValue(c);
        if (c == '=') {
            value = 0;
            ++padding;
        } else if (value < 0) {
            continue;
        }
        group = (group << 6) | static_cast<unsigned int>(value);
        if (++symbols < 4) {
            continue;
        }
        const int bytes = 3 - padding;
        for (int i = 0; i < bytes; ++i) {
            out.push_back(static_cast<unsigned char>(group >> (16 - 8 * i)));
        }
        group = 0;
        symbols = 0;
        padding = 0;
    }
}

}  // namespace Util
