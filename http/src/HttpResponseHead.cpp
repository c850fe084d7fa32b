#include "HttpResponseHead.h"

namespace Network {

namespace {

std::string trimmed(const std::string& text) {
    std::size_t first = text.find_first_not_of(" \t");
    if (first == std::string::npos) {
        return std::string();
    }
    std::size_t last = text.find_last_not_of(" \t");
    return text.substr(first, last - first + 1);
}

// The three digits after the version; 0 when they are not there. libcurl has
// refused status lines it cannot read before we see them.
int parseStatusCode(const std::string& text) {
    int code = 0;
    for (std::size_t i = 0; i < 3; ++i) {
        if (i >= text.size() || text[i] < '0' || text[i] > '9') {
            return 0;
        }
        code = code * 10 + (text[i] - '0');
    }
    return code;
}

}  // namespace

HttpResponseHead::Line HttpResponseHead::addLine(const char* data, std::size_t length) {
    std::string line(data, length);
    while (!line.empty() && (line.back() == '\n' || line.back() == '\r')) {
        line.pop_back();
    }
    if (line.empty()) {
        return EndOfHead;
    }
    if (line.compare(0, 5, "HTTP/") == 0) {
        startAnswer(line);
        return StatusLine;
    }
    if ((line[0] == ' ' || line[0] == '\t') && !headers.empty()) {
        // An obsolete folded continuation of the previous field.
        headers.back().second += " " + trimmed(line);
    } else {
        std::size_t colon = line.find(':');
        if (colon != std::string::npos) {
            headers.push_back(
                std::make_pair(trimmed(line.substr(0, colon)), trimmed(line.substr(colon + 1))));
        }
    }
    return Field;
}

void HttpResponseHead::startAnswer(const std::string& statusLine) {
    std::size_t codeStart = statusLine.find(' ');
    statusCode = codeStart != std::string::npos ? parseStatusCode(statusLine.substr(codeStart + 1)) : 0;
    std::size_t reasonStart =
        codeStart != std::string::npos ? statusLine.find(' ', codeStart + 1) : std::string::npos;
    reasonPhrase =
        reasonStart != std::string::npos ? trimmed(statusLine.substr(reasonStart + 1)) : std::string();
    headers.clear();
}

}  // namespace Network
