#pragma once

#include <cstddef>
#include <string>

#include "network/HttpResponse.h"

namespace Network {

// Collects the status line and header fields of one answer from the lines
// libcurl hands over. The lines are the server's and untrusted: any bytes are
// taken without harm. Engine thread.
class HttpResponseHead {
public:
    enum Line { StatusLine, Field, EndOfHead };

    HttpResponseHead() : statusCode(0) {}

    // Takes one line, with or without its line break. A status line starts a
    // new head (after an interim answer or a redirect); the blank line ends
    // it. Lines of neither shape are ignored.
    Line addLine(const char* data, std::size_t length);

    int getStatusCode() const { return statusCode; }
    HttpResponse toResponse() const { return HttpResponse(statusCode, reasonPhrase, headers); }

private:
    void startAnswer(const std::string& statusLine);

    int statusCode;
    std::string reasonPhrase;
    HttpResponse::Headers headers;
};

}  // namespace Network
