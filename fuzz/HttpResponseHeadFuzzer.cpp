// Answer heads from servers, cut into lines as libcurl hands them over,
// through the engine's head parser and the response's Content-Length reading.
// Whatever the bytes, a status code has three digits or is 0, and a length is
// a number or -1.
#include <cstddef>
#include <cstdint>

#include "../http/src/HttpResponseHead.h"
#include "FuzzSupport.h"

using fuzz::check;

namespace {

void checkHead(const Network::HttpResponseHead& head) {
    const Network::HttpResponse response = head.toResponse();
    check(response.getStatusCode() >= 0 && response.getStatusCode() <= 999,
          "a status has three digits or is 0");
    check(response.getContentLength() >= -1, "a length is a number or -1");
    for (const Network::HttpResponse::Headers::value_type& field : response.getHeaders()) {
        check(response.hasHeader(field.first), "every field is found by its name");
    }
    response.getHeader("Location");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const char* text = reinterpret_cast<const char*>(data);
    Network::HttpResponseHead head;
    std::size_t start = 0;
    while (start < size) {
        std::size_t end = start;
        while (end < size && text[end] != '\n') {
            ++end;
        }
        std::size_t length = (end < size ? end + 1 : end) - start;
        if (head.addLine(text + start, length) == Network::HttpResponseHead::EndOfHead) {
            checkHead(head);
        }
        start += length;
    }
    checkHead(head);
    return 0;
}
