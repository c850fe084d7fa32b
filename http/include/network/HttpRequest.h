#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <string>
#include <utility>
#include <vector>

namespace Network {

class HttpTransfer;

// What one HTTP exchange sends: URL, method, headers, body and how patient
// to be. Configure it on one thread before starting a connection with it;
// the body stream may be written from any thread. One request may serve
// several connections (a retry), each sending the same body.
class HttpRequest {
public:
    class HttpBodyStream;
    class MultipartBuilder;

    typedef std::vector<std::pair<std::string, std::string> > Headers;

    // Which 3xx answers are followed instead of being handed over as the
    // response (up to 10 hops, http and https only).
    enum RedirectPolicy {
        NoRedirects,
        AnyRedirect,
        // Only to the host of the request, keeping its scheme or going from
        // http to https. Any other redirect is logged and handed over.
        SameHostRedirects
    };

    // timeoutMs: the longest wait for connecting and, afterwards, for any byte
    // to move in either direction; 0 or less waits forever.
    // followRedirects: AnyRedirect when true, NoRedirects when false.
    static boost::shared_ptr<HttpRequest> create(const char* url, const char* method, int timeoutMs,
                                                 bool followRedirects);
    ~HttpRequest();

    // Sends content as a multipart/form-data body delimited by boundary (see
    // MultipartBuilder). Not combined with a body stream.
    void setBody(const std::string& boundary, const std::string& content);
    // The body written while the request runs (chunked when it is still open
    // at the start). Created on the first call, which must come before the
    // connection starts; not combined with setBody.
    boost::shared_ptr<HttpBodyStream> getBodyStream();
    // Adds a request header; names and values must not contain line breaks.
    void addHeader(const std::string& name, const std::string& value);
    void setRedirectPolicy(RedirectPolicy policy) { redirectPolicy = policy; }

    const std::string& getUrl() const { return url; }
    const std::string& getMethod() const { return method; }
    int getTimeoutMs() const { return timeoutMs; }
    RedirectPolicy getRedirectPolicy() const { return redirectPolicy; }
    const Headers& getHeaders() const { return headers; }
    bool hasFixedBody() const { return fixedBody; }
    const std::string& getFixedBody() const { return body; }
    // The stream if getBodyStream() was called, else empty.
    boost::shared_ptr<HttpBodyStream> findBodyStream() const;

private:
    HttpRequest(const char* url, const char* method, int timeoutMs, bool followRedirects);
    HttpRequest(const HttpRequest&) = delete;
    HttpRequest& operator=(const HttpRequest&) = delete;

    std::string url;
    std::string method;
    int timeoutMs;
    RedirectPolicy redirectPolicy;
    Headers headers;
    bool fixedBody;
    std::string body;
    // Guards bodyStream: a body writer may open the stream from any thread.
    KDThreadMutex* mutex;
    boost::shared_ptr<HttpBodyStream> bodyStream;
};

// A request body produced while the request runs. write and closeWrite may be
// called from any thread; the engine thread reads.
class HttpRequest::HttpBodyStream {
public:
    HttpBodyStream();
    ~HttpBodyStream();

    void write(const char* data, unsigned int size);
    // Ends the body; writing afterwards is a programming error.
    void closeWrite();

private:
    friend class HttpTransfer;

    HttpBodyStream(const HttpBodyStream&) = delete;
    HttpBodyStream& operator=(const HttpBodyStream&) = delete;

    // For the engine: copies up to capacity bytes from offset on; ended is set
    // when the body is closed and nothing lies beyond what was copied.
    std::size_t read(std::size_t offset, char* buffer, std::size_t capacity, bool& ended);
    // True, with the body's full size, once the body is closed.
    bool getClosedSize(std::size_t& size);
    // The transfer is told (from the writing thread) when bytes arrive or the
    // body ends.
    void addReader(const boost::weak_ptr<HttpTransfer>& reader);
    void notifyReaders();

    KDThreadMutex* mutex;
    // Kept whole, not consumed, so that every connection of the request reads
    // the same body.
    std::string data;
    bool closed;
    std::vector<boost::weak_ptr<HttpTransfer> > readers;
};

// Encodes form fields as a multipart/form-data body. One thread.
class HttpRequest::MultipartBuilder {
public:
    static boost::shared_ptr<MultipartBuilder> create(const char* boundary);

    // binary: the part is labelled application/octet-stream unless
    // contentType says otherwise (text parts carry no type by default).
    // asFile: the part is sent as a file upload named after the field.
    // contentType: the part's Content-Type; empty for the default above.
    void addField(const std::string& name, const std::string& value, bool binary, bool asFile,
                  const std::string& contentType);
    // The boundary to announce with the content. It is the one given to
    // create() unless a field's value contains it; it is then lengthened until
    // no value does, so the body always parses back into its fields.
    std::string getBoundary() const { return boundary; }
    std::string getEncodedContent() const;

private:
    struct Field {
        std::string name;
        std::string value;
        bool asFile;
        std::string contentType;
    };

    explicit MultipartBuilder(const char* boundary);

    void lengthenBoundaryToAvoid(const std::string& value);

    std::string boundary;
    std::vector<Field> fields;
};

}  // namespace Network
