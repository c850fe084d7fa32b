#include "network/HttpResponse.h"

#include <strings.h>

#include <limits>

namespace Network {

namespace {

const long long kLargestLength = std::numeric_limits<long long>::max();

// Plain decimal digits that fit: no sign, no exponent, no overflow.
long long parseLength(const std::string& text) {
    std::size_t first = text.find_first_not_of(" \t");
    std::size_t last = text.find_last_not_of(" \t");
    if (first == std::string::npos) {
        return -1;
    }
    long long value = 0;
    for (std::size_t i = first; i <= last; ++i) {
        char c = text[i];
        if (c < '0' || c > '9' || value > (kLargestLength - (c - '0')) / 10) {
            return -1;
        }
        value = value * 10 + (c - '0');
    }
    return value;
}

}  // namespace

HttpResponse::HttpResponse(int statusCode, const std::string& reasonPhrase, const Headers& headers)
    : statusCode(statusCode), reasonPhrase(reasonPhrase), headers(headers) {}

bool HttpResponse::hasHeader(const std::string& name) const {
    return findHeader(name) != nullptr;
}

std::string HttpResponse::getHeader(const std::string& name) const {
    const Headers::value_type* header = findHeader(name);
    return header != nullptr ? header->second : std::string();
}

long long HttpResponse::getContentLength() const {
    long long length = -1;
    for (const Headers::value_type& header : headers) {
        if (strcasecmp(header.first.c_str(), "Content-Length") != 0) {
            continue;
        }
        // Repeated fields and lists ("42, 42") are tolerated when they agree;
        // anything else leaves the body's end unknown.
        std::size_t start = 0;
        for (;;) {
            std::size_t comma = header.second.find(',', start);
            long long value = parseLength(header.second.substr(start, comma - start));
            if (value < 0 || (length >= 0 && value != length)) {
                return -1;
            }
            length = value;
            if (comma == std::string::npos) {
                break;
            }
            start = comma + 1;
        }
    }
    return length;
}

const HttpResponse::Headers::value_type* HttpResponse::findHeader(const std::string& name) const {
    for (const Headers::value_type& header : headers) {
        if (strcasecmp(header.first.c_str(), name.c_str()) == 0) {
            return &header;
        }
    }
    return nullptr;
}

}  // namespace Network
