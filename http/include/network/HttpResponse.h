#pragma once

#include <string>
#include <utility>
#include <vector>

namespace Network {

// The status line and headers of an HTTP answer (of the last hop when
// redirects are followed). Built on the engine thread, then immutable: any
// thread may read it.
class HttpResponse {
public:
    typedef std::vector<std::pair<std::string, std::string> > Headers;

    HttpResponse(int statusCode, const std::string& reasonPhrase, const Headers& headers);

    int getStatusCode() const { return statusCode; }
    const std::string& getReasonPhrase() const { return reasonPhrase; }
    // In arrival order, repeated names kept (Set-Cookie ...).
    const Headers& getHeaders() const { return headers; }
    bool hasHeader(const std::string& name) const;
    // The first value of the header, matched without regard to case; "" when absent.
    std::string getHeader(const std::string& name) const;
    std::string getContentType() const { return getHeader("Content-Type"); }
    // The announced body length, or -1 when the server gave none or a bad one
    // (not plain digits, too large, or repeated with different values).
    long long getContentLength() const;

private:
    const Headers::value_type* findHeader(const std::string& name) const;

    int statusCode;
    std::string reasonPhrase;
    Headers headers;
};

}  // namespace Network
