#include "util/UrlEncoding.h"

namespace Util {

namespace {

const char kHexDigits[] = "0123456789ABCDEF";

bool isUnreserved(unsigned char c) {
    if ((c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9')) {
        return true;
    }
    for (const char* mark = "-_.!~*'()"; *mark != '\0'; ++mark) {
        if (c == static_cast<unsigned char>(*mark)) {
            return true;
        }
    }
    return false;
}

int hexValue(char c) {
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    if (c >= 'a' && c <= 'f') {
        return c - 'a' + 10;
    }
    if (c >= 'A' && c <= 'F') {
        return c - 'A' + 10;
    }
    return -1;
}

}  // namespace

unsigned int UrlEncode(const char* in, char* out, unsigned int outSize) {
    if (outSize == 0) {
        return 0;
    }
    unsigned int written = 0;
    for (; *in != '\0'; ++in) {
        const unsigned char c = static_cast<unsigned char>(*in);
        const bool copied = c == ' ' || isUnreserved(c);
        const unsigned int width = copied ? 1 : 3;
        if (written + width >= outSize) {
            break;
        }
        if (c == ' ') {
            out[written++] = '+';
        } else if (copied) {
            out[written++] = static_cast<char>(c);
        } else {
            out[written++] = '%';
            out[written++] = kHexDigits[c >> 4];
            out[written++] = kHexDigits[c & 0x0F];
        }
    }
    out[written] = '\0';
    return written;
}

unsigned int UrlDecode(const char* in, char* out) {
    unsigned int written = 0;
    while (*in != '\0') {
        if (*in == '+') {
            out[written++] = ' ';
            ++in;
        } else if (*in != '%') {
            out[written++] = *in++;
        } else {
            // Short-circuits at a terminator, so a trailing "%" or "%X" never reads past the end.
            const int high = hexValue(in[1]);
            const int low = high < 0 ? -1 : hexValue(in[2]);
            if (low < 0) {
                out[written++] = '?';
                ++in;
            } else {
                out[written++] = static_cast<char>((high << 4) | low);
                in += 3;
            }
        }
    }
    out[written] = '\0';
    return written;
}

}  // namespace Util
