#include "network/HttpResponse.h"

#include <strings.h>

#include <cstdlib>

namespace Network {

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
    const Headers::value_type* header = findHeader("Content-Length");
    if (header == nullptr || header->second.empty()) {
        return -1;
    }
    const char* text = header->second.c_str();
    char* end = nullptr;
    long long length = std::strtoll(text, &end, 10);
    if (*end != '\0' || length < 0 || text[0] == '-' || text[0] == '+') {
        return -1;
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
