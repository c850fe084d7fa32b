#pragma once

#include <cstddef>
#include <string>

#include "devserver/Journal.h"

namespace DevServer {

// The plain HTML page at "/": the most recent startup requests, positioning
// queries with their answers and uploads with their chunks, newest first.
// Everything that came from a request is HTML-escaped. Any thread.
class StatusPage {
public:
    static const std::size_t kRecent = 50;

    static std::string render(const Journal& journal, const std::string& baseUrl);
};

}  // namespace DevServer
