#include "network/HttpRequest.h"

#include <strings.h>

namespace Network {

namespace {

bool hasLineBreak(const std::string& text) {
    return text.find_first_of("\r\n") != std::string::npos;
}

}  // namespace

boost::shared_ptr<HttpRequest> HttpRequest::create(const char* url, const char* method, int timeoutMs,
                                                   bool followRedirects) {
    return boost::shared_ptr<HttpRequest>(new HttpRequest(url, method, timeoutMs, followRedirects));
}

HttpRequest::HttpRequest(const char* url, const char* method, int timeoutMs, bool followRedirects)
    : url(url != nullptr ? url : ""),
      method(method != nullptr ? method : ""),
      timeoutMs(timeoutMs),
      redirectPolicy(followRedirects ? AnyRedirect : NoRedirects),
      fixedBody(false),
      mutex(kdThreadMutexCreate(nullptr)) {
    KD_ASSERT(url != nullptr && method != nullptr);
}

HttpRequest::~HttpRequest() {
    kdThreadMutexFree(mutex);
}

void HttpRequest::setBody(const std::string& boundary, const std::string& content) {
    KD_ASSERT(!findBodyStream());
    KD_ASSERT(!hasLineBreak(boundary));
    fixedBody = true;
    body = content;
    for (Headers::iterator it = headers.begin(); it != headers.end();) {
        it = strcasecmp(it->first.c_str(), "Content-Type") == 0 ? headers.erase(it) : it + 1;
    }
    addHeader("Content-Type", "multipart/form-data; boundary=" + boundary);
}

boost::shared_ptr<HttpRequest::HttpBodyStream> HttpRequest::getBodyStream() {
    KD_ASSERT(!fixedBody);
    kdThreadMutexLock(mutex);
    if (!bodyStream) {
        bodyStream.reset(new HttpBodyStream());
    }
    boost::shared_ptr<HttpBodyStream> stream = bodyStream;
    kdThreadMutexUnlock(mutex);
    return stream;
}

boost::shared_ptr<HttpRequest::HttpBodyStream> HttpRequest::findBodyStream() const {
    kdThreadMutexLock(mutex);
    boost::shared_ptr<HttpBodyStream> stream = bodyStream;
    kdThreadMutexUnlock(mutex);
    return stream;
}

void HttpRequest::addHeader(const std::string& name, const std::string& value) {
    // A line break would let the header smuggle further headers or a second
    // request onto the wire.
    KD_ASSERT(!name.empty() && !hasLineBreak(name) && !hasLineBreak(value));
    if (name.empty() || hasLineBreak(name) || hasLineBreak(value)) {
        return;
    }
    headers.push_back(std::make_pair(name, value));
}

}  // namespace Network
