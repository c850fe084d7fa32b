#include "HttpTransfer.h"

#include <KD/kdext.h>
#include <strings.h>

#include <algorithm>
#include <boost/make_shared.hpp>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "HttpEngineCore.h"
#include "network/HttpConnection.h"
#include "network/HttpFinishCodes.h"

namespace Network {

namespace {

const long kMaxRedirects = 10;
// The last chunk of a chunked body without trailers: "0\r\n\r\n".
const curl_off_t kLastChunkSize = 5;

bool isTokenCharacter(char c) {
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
           std::strchr("!#$%&'*+-.^_`|~", c) != nullptr;
}

// A method goes onto the request line verbatim, so it must be an HTTP token.
bool isValidMethod(const std::string& method) {
    if (method.empty()) {
        return false;
    }
    for (char c : method) {
        if (!isTokenCharacter(c)) {
            return false;
        }
    }
    return true;
}

bool isRedirect(int statusCode) {
    return statusCode >= 300 && statusCode < 400;
}

// A 304 answers a conditional request; it sends nobody anywhere.
bool isFollowedRedirect(int statusCode) {
    return isRedirect(statusCode) && statusCode != 304;
}

bool containsNoCase(const std::string& text, const std::string& word) {
    return std::search(text.begin(), text.end(), word.begin(), word.end(), [](char a, char b) {
               return std::tolower(static_cast<unsigned char>(a)) ==
                      std::tolower(static_cast<unsigned char>(b));
           }) != text.end();
}

int codeUnlessOffline(int code) {
    return kdGetNetworkReachabilityStatusZVR() == 0 ? HTTP_OFFLINE_ERROR_CODE : code;
}

// reachedServer: a connection was made, so whatever went wrong came back
// from the server's side.
int classify(CURLcode result, bool reachedServer) {
    switch (result) {
        case CURLE_OPERATION_TIMEDOUT:
            return HTTP_TIMEOUT_ERROR_CODE;
        case CURLE_COULDNT_CONNECT:
            return HTTP_CONNECTION_REFUSED_ERROR_CODE;
        case CURLE_COULDNT_RESOLVE_HOST:
        case CURLE_COULDNT_RESOLVE_PROXY:
            return HTTP_HOST_NOT_RESOLVED_ERROR_CODE;
        case CURLE_PARTIAL_FILE:
        case CURLE_RECV_ERROR:
        case CURLE_SEND_ERROR:
        case CURLE_GOT_NOTHING:
            return HTTP_CONNECTION_LOST_ERROR_CODE;
        case CURLE_WEIRD_SERVER_REPLY:
        case CURLE_BAD_CONTENT_ENCODING:
        case CURLE_TOO_MANY_REDIRECTS:
        case CURLE_HTTP2:
        case CURLE_HTTP2_STREAM:
        case CURLE_HTTP3:
        case CURLE_FILESIZE_EXCEEDED:
#if LIBCURL_VERSION_NUM >= 0x080600
        case CURLE_TOO_LARGE:
#endif
            return HTTP_BAD_RESPONSE_ERROR_CODE;
        case CURLE_UNSUPPORTED_PROTOCOL:
            // Said of our URL, or of an answer that is not HTTP/1.x or later
            // (or of a redirect to another scheme).
            return reachedServer ? HTTP_BAD_RESPONSE_ERROR_CODE : HTTP_BAD_REQUEST_ERROR_CODE;
        case CURLE_URL_MALFORMAT:
            return HTTP_BAD_REQUEST_ERROR_CODE;
        case CURLE_SSL_CONNECT_ERROR:
        case CURLE_PEER_FAILED_VERIFICATION:
        case CURLE_SSL_CERTPROBLEM:
        case CURLE_SSL_CIPHER:
        case CURLE_SSL_CACERT_BADFILE:
        case CURLE_SSL_ISSUER_ERROR:
        case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
        case CURLE_SSL_INVALIDCERTSTATUS:
            return HTTP_TLS_ERROR_CODE;
        default:
            return HTTP_GENERIC_ERROR_CODE;
    }
}

}  // namespace

HttpTransfer::HttpTransfer(const boost::shared_ptr<HttpRequest>& request, int id,
                           const boost::weak_ptr<NetworkSpeedCollector>& speedCollector, bool wholeBody,
                           long long maxBodySize, const boost::shared_ptr<HttpDeliveryQueue>& deliveries,
                           const boost::weak_ptr<HttpConnection>& connection)
    : request(request),
      id(id),
      speedCollector(speedCollector),
      wholeBody(wholeBody),
      maxBodySize(maxBodySize),
      deliveries(deliveries),
      connection(connection),
      bodyStream(request->hasFixedBody() ? boost::shared_ptr<HttpRequest::HttpBodyStream>()
                                         : request->findBodyStream()),
      requestSize(0),
      handle(nullptr),
      headerList(nullptr),
      uploadOffset(0),
      uploadPaused(false),
      receivePaused(false),
      socket(CURL_SOCKET_BAD),
      headersOut(false),
      bodyBytesOut(0),
      bytesOutAfterBodyEnd(0),
      bodySize(-1),
      hasBody(false),
      bodyEnded(false),
      errnoAtConnect(0),
      connected(false),
      skippingBlock(false),
      responseDelivered(false),
      chunkedResponse(false),
      stoppedAfterAnswer(false),
      badAnswer(false),
      bodyBytesReceived(0),
      bodyTooLarge(false),
      outOfMemory(false),
      sentReported(false),
      finished(false),
      deliveriesQueued(false) {
    errorText[0] = '\0';
}

HttpTransfer::~HttpTransfer() {
    curl_slist_free_all(headerList);
}

bool HttpTransfer::begin(const boost::shared_ptr<HttpEngineCore>& engine) {
    core = engine;
    if (bodyStream) {
        bodyStream->addReader(shared_from_this());
    }
    deliveries->setBacklogReader(shared_from_this());
    return engine->add(shared_from_this());
}

void HttpTransfer::cancel() {
    deliveries->detach();
    boost::shared_ptr<HttpEngineCore> engine = core.lock();
    if (engine) {
        engine->remove(shared_from_this());
    }
}

void HttpTransfer::onBodyAvailable() {
    boost::shared_ptr<HttpEngineCore> engine = core.lock();
    if (engine) {
        engine->resume(shared_from_this());
    }
}

void HttpTransfer::onBacklogDrained() {
    onBodyAvailable();
}

bool HttpTransfer::open(CURL* curl) {
    handle = curl;
    touch();
    if (!isValidMethod(request->getMethod())) {
        kdLogFormatMessage("HttpConnection %d: invalid method \"%s\"", id, request->getMethod().c_str());
        finish(HTTP_BAD_REQUEST_ERROR_CODE);
        return false;
    }
    curl_easy_setopt(handle, CURLOPT_URL, request->getUrl().c_str());
    // Our engine thread has no use for signals; libcurl must not raise any.
    curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
    // URLs come partly from servers (host table, redirects): nothing but HTTP.
    curl_easy_setopt(handle, CURLOPT_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(handle, CURLOPT_REDIR_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(handle, CURLOPT_FOLLOWLOCATION, request->getFollowRedirects() ? 1L : 0L);
    curl_easy_setopt(handle, CURLOPT_MAXREDIRS, kMaxRedirects);
    if (request->getTimeoutMs() > 0) {
        curl_easy_setopt(handle, CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(request->getTimeoutMs()));
    }
    curl_easy_setopt(handle, CURLOPT_ERRORBUFFER, errorText);
    curl_easy_setopt(handle, CURLOPT_HEADERFUNCTION, &HttpTransfer::onHeaderLine);
    curl_easy_setopt(handle, CURLOPT_HEADERDATA, this);
    curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, &HttpTransfer::onBodyBytes);
    curl_easy_setopt(handle, CURLOPT_WRITEDATA, this);
    curl_easy_setopt(handle, CURLOPT_PREREQFUNCTION, &HttpTransfer::onConnected);
    curl_easy_setopt(handle, CURLOPT_PREREQDATA, this);
    // The debug hook is libcurl's word on what has been written to the
    // socket: it tells when the request has left. Verbose only routes
    // libcurl's reports to it; nothing is printed.
    curl_easy_setopt(handle, CURLOPT_DEBUGFUNCTION, &HttpTransfer::onDebug);
    curl_easy_setopt(handle, CURLOPT_DEBUGDATA, this);
    curl_easy_setopt(handle, CURLOPT_VERBOSE, 1L);
    setMethodAndBody();
    setHeaders();
    return true;
}

void HttpTransfer::setMethodAndBody() {
    const std::string& method = request->getMethod();
    hasBody = request->hasFixedBody() || bodyStream;
    if (!hasBody) {
        if (method == "GET") {
            curl_easy_setopt(handle, CURLOPT_HTTPGET, 1L);
        } else if (method == "HEAD") {
            curl_easy_setopt(handle, CURLOPT_NOBODY, 1L);
        } else if (method == "POST") {
            curl_easy_setopt(handle, CURLOPT_POST, 1L);
            curl_easy_setopt(handle, CURLOPT_POSTFIELDSIZE, 0L);
            curl_easy_setopt(handle, CURLOPT_POSTFIELDS, "");
        } else {
            curl_easy_setopt(handle, CURLOPT_CUSTOMREQUEST, method.c_str());
        }
        return;
    }
    // Every body goes through the read callback, so that sending counts as
    // activity for the timeout and a retry on a fresh connection can rewind.
    curl_easy_setopt(handle, CURLOPT_POST, 1L);
    curl_easy_setopt(handle, CURLOPT_READFUNCTION, &HttpTransfer::onUploadRead);
    curl_easy_setopt(handle, CURLOPT_READDATA, this);
    curl_easy_setopt(handle, CURLOPT_SEEKFUNCTION, &HttpTransfer::onUploadSeek);
    curl_easy_setopt(handle, CURLOPT_SEEKDATA, this);
    std::size_t size = 0;
    if (request->hasFixedBody()) {
        size = request->getFixedBody().size();
    }
    bool sizeKnown = request->hasFixedBody() || bodyStream->getClosedSize(size);
    // An unknown size makes libcurl send the body chunked.
    bodySize = sizeKnown ? static_cast<curl_off_t>(size) : static_cast<curl_off_t>(-1);
    curl_easy_setopt(handle, CURLOPT_POSTFIELDSIZE_LARGE, bodySize);
    if (method != "POST") {
        curl_easy_setopt(handle, CURLOPT_CUSTOMREQUEST, method.c_str());
    }
}

void HttpTransfer::setHeaders() {
    // Without this libcurl waits for a "100 Continue" before larger bodies,
    // a second lost on servers that never send one.
    headerList = curl_slist_append(headerList, "Expect:");
    bool hasContentType = false;
    for (const HttpRequest::Headers::value_type& header : request->getHeaders()) {
        hasContentType = hasContentType || strcasecmp(header.first.c_str(), "Content-Type") == 0;
        headerList = curl_slist_append(headerList, (header.first + ": " + header.second).c_str());
    }
    if (bodyStream && !hasContentType) {
        headerList = curl_slist_append(headerList, "Content-Type: application/octet-stream");
    }
    curl_easy_setopt(handle, CURLOPT_HTTPHEADER, headerList);
}

void HttpTransfer::resume() {
    if (!uploadPaused && !receivePaused) {
        return;
    }
    // Time spent waiting for our own side is not the server's silence.
    if (receivePaused) {
        touch();
    }
    uploadPaused = false;
    receivePaused = false;
    // May call the read and write callbacks at once, which pause again.
    curl_easy_pause(handle, CURLPAUSE_CONT);
}

void HttpTransfer::forgetSocket(curl_socket_t closed) {
    if (socket == closed) {
        socket = CURL_SOCKET_BAD;
    }
}

bool HttpTransfer::isExpired(Clock::time_point now) const {
    Clock::time_point deadline;
    return getDeadline(deadline) && now >= deadline;
}

bool HttpTransfer::getDeadline(Clock::time_point& deadline) const {
    if (request->getTimeoutMs() <= 0 || receivePaused) {
        return false;
    }
    deadline = lastActivity + std::chrono::milliseconds(request->getTimeoutMs());
    return true;
}

void HttpTransfer::complete(CURLcode result) {
    if (bodyTooLarge) {
        kdLogFormatMessage("HttpConnection %d: the body is larger than %lld bytes", id, maxBodySize);
        finish(HTTP_BODY_TOO_LARGE_ERROR_CODE);
        return;
    }
    if (outOfMemory) {
        kdLogFormatMessage("HttpConnection %d: no memory for the body", id);
        finish(HTTP_GENERIC_ERROR_CODE);
        return;
    }
    if (stoppedAfterAnswer) {
        finish(HTTP_FINISHED_OK);
        return;
    }
    if (badAnswer) {
        kdLogFormatMessage("HttpConnection %d: the answer's length cannot be trusted", id);
        finish(HTTP_BAD_RESPONSE_ERROR_CODE);
        return;
    }
    if (result == CURLE_OK) {
        // libcurl takes a close inside the head for the end of a bodiless
        // answer; without its blank line the head is cut short.
        if (!responseDelivered && !skippingBlock) {
            kdLogFormatMessage("HttpConnection %d: the answer ended inside its head", id);
            finish(HTTP_BAD_RESPONSE_ERROR_CODE);
            return;
        }
        finish(HTTP_FINISHED_OK);
        return;
    }
    char* serverAddress = nullptr;
    curl_easy_getinfo(handle, CURLINFO_PRIMARY_IP, &serverAddress);
    bool reachedServer = serverAddress != nullptr && serverAddress[0] != '\0';
    int code = isFramingFault(result) ? HTTP_BAD_RESPONSE_ERROR_CODE : classify(result, reachedServer);
    code = codeUnlessOffline(code);
    kdLogFormatMessage("HttpConnection %d: failed with %d: %s", id, code,
                       errorText[0] != '\0' ? errorText : curl_easy_strerror(result));
    finish(code);
}

// libcurl reports a bad chunk and a head beyond its size limits with the
// codes it also uses for trouble on the socket. Only the socket's trouble
// leaves an OS error behind.
bool HttpTransfer::isFramingFault(CURLcode result) const {
    bool inHead = connected && !responseDelivered;
    if (result == CURLE_OUT_OF_MEMORY) {
        return inHead;
    }
    if (result != CURLE_RECV_ERROR) {
        return false;
    }
    long osError = 0;
    curl_easy_getinfo(handle, CURLINFO_OS_ERRNO, &osError);
    return osError == errnoAtConnect && (inHead || chunkedResponse);
}

void HttpTransfer::fail(int code) {
    kdLogFormatMessage("HttpConnection %d: failed with %d", id, code);
    finish(code);
}

void HttpTransfer::expire() {
    fail(codeUnlessOffline(HTTP_TIMEOUT_ERROR_CODE));
}

void HttpTransfer::abandon() {
    if (finished) {
        return;
    }
    finished = true;
    boost::shared_ptr<NetworkSpeedCollector> target = collector();
    if (target) {
        target->onRequestCanceled(id);
    }
}

void HttpTransfer::flushDeliveries() {
    if (deliveriesQueued) {
        deliveriesQueued = false;
        deliveries->flush();
    }
}

void HttpTransfer::close() {
    flushDeliveries();
    curl_slist_free_all(headerList);
    headerList = nullptr;
    handle = nullptr;
    socket = CURL_SOCKET_BAD;
}

// The request is about to leave on an open connection: the server's time to
// answer starts now, not when connecting started.
int HttpTransfer::onConnected(void* self, char*, char*, int serverPort, int localPort) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    transfer->touch();
    transfer->connected = true;
    boost::shared_ptr<HttpEngineCore> engine = transfer->core.lock();
    transfer->socket = engine ? engine->findSocket(localPort, serverPort) : CURL_SOCKET_BAD;
    curl_easy_getinfo(transfer->handle, CURLINFO_OS_ERRNO, &transfer->errnoAtConnect);
    return CURL_PREREQFUNC_OK;
}

int HttpTransfer::onDebug(CURL*, curl_infotype type, char*, size_t size, void* self) {
    if (type == CURLINFO_HEADER_OUT || type == CURLINFO_DATA_OUT) {
        static_cast<HttpTransfer*>(self)->noteOutgoing(type, size);
    }
    return 0;
}

void HttpTransfer::noteOutgoing(curl_infotype type, size_t size) {
    requestSize.fetch_add(static_cast<long long>(size));
    if (type == CURLINFO_HEADER_OUT) {
        headersOut = true;
    } else {
        bodyBytesOut += static_cast<curl_off_t>(size);
        if (bodyEnded) {
            bytesOutAfterBodyEnd += static_cast<curl_off_t>(size);
        }
    }
    if (hasRequestLeft()) {
        reportSent();
    }
}

// libcurl refills its send buffer only once it is empty, so when the body's
// end has been handed over, all before it has left and only the last chunk
// remains.
bool HttpTransfer::hasRequestLeft() const {
    if (!headersOut) {
        return false;
    }
    if (!hasBody) {
        return true;
    }
    if (bodySize >= 0) {
        return bodyBytesOut >= bodySize;
    }
    return bodyEnded && bytesOutAfterBodyEnd >= kLastChunkSize;
}

size_t HttpTransfer::onHeaderLine(char* data, size_t size, size_t count, void* self) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    size_t length = size * count;
    transfer->touch();
    // Lines after the response was handed over are trailers: not kept.
    if (transfer->responseDelivered) {
        return length;
    }
    switch (transfer->head.addLine(data, length)) {
        case HttpResponseHead::StatusLine:
            transfer->skippingBlock = false;
            break;
        case HttpResponseHead::EndOfHead:
            return transfer->headEnded() ? length : 0;
        case HttpResponseHead::Field:
            break;
    }
    return length;
}

bool HttpTransfer::headEnded() {
    int statusCode = head.getStatusCode();
    if (statusCode >= 100 && statusCode < 200) {
        skippingBlock = true;
        return true;
    }
    HttpResponse answer = head.toResponse();
    if (answer.hasHeader("Content-Length") && answer.getContentLength() < 0) {
        badAnswer = true;
        return false;
    }
    bool hasLocation = !answer.getHeader("Location").empty();
    bool following = request->getFollowRedirects() && isRedirect(statusCode) && hasLocation;
    skippingBlock = following && isFollowedRedirect(statusCode);
    if (skippingBlock) {
        return true;
    }
    chunkedResponse = containsNoCase(answer.getHeader("Transfer-Encoding"), "chunked");
    // The server has the request should its leaving have gone unseen (a
    // server that answers before reading the whole body).
    reportSent();
    deliverResponse();
    // libcurl would follow the Location of a final answer too (a 304): this
    // answer is complete and stays the only one.
    stoppedAfterAnswer = following;
    return !stoppedAfterAnswer;
}

void HttpTransfer::deliverResponse() {
    responseDelivered = true;
    deliveries->pushResponse(boost::make_shared<HttpResponse>(head.toResponse()));
    deliveriesQueued = true;
}

size_t HttpTransfer::onBodyBytes(char* data, size_t size, size_t count, void* self) {
    return static_cast<HttpTransfer*>(self)->receiveBody(data, size * count);
}

size_t HttpTransfer::receiveBody(char* data, size_t length) {
    touch();
    if (skippingBlock) {
        return length;
    }
    if (!responseDelivered) {
        deliverResponse();
    }
    // A caller slow to take the parts holds the transfer: libcurl keeps these
    // bytes and stops reading until resume().
    if (!wholeBody && !deliveries->hasRoomForBody()) {
        receivePaused = true;
        return CURL_WRITEFUNC_PAUSE;
    }
    // A server may stream for ever, each byte resetting the silence timeout.
    if (maxBodySize > 0 && static_cast<long long>(length) > maxBodySize - bodyBytesReceived) {
        bodyTooLarge = true;
        wholeBodyData.reset();
        return 0;
    }
    bodyBytesReceived += static_cast<long long>(length);
    const unsigned char* bytes = reinterpret_cast<const unsigned char*>(data);
    boost::shared_ptr<NetworkSpeedCollector> target = collector();
    boost::shared_ptr<DataChunk> chunk;
    if (!wholeBody || target) {
        chunk = boost::make_shared<DataChunk>(bytes, length);
    }
    if (target) {
        target->onDataChunkReceived(id, chunk.get());
    }
    if (!wholeBody) {
        deliveries->pushBodyData(chunk);
        deliveriesQueued = true;
        return length;
    }
    // The engine thread must not end in an exception; the transfer fails instead.
    try {
        keepWholeBody(bytes, length);
    } catch (const std::bad_alloc&) {
        outOfMemory = true;
        wholeBodyData.reset();
        return 0;
    }
    return length;
}

void HttpTransfer::keepWholeBody(const unsigned char* bytes, size_t length) {
    const int statusCode = head.getStatusCode();
    const bool errorAnswer = statusCode < 200 || statusCode > 299;
    if (!wholeBodyData) {
        wholeBodyData = boost::make_shared<DataChunk>();
        wholeBodyData->reserve(bodyCapacity(errorAnswer));
    }
    size_t kept = length;
    if (errorAnswer) {
        const size_t limit = HttpConnection::kMaxKeptErrorBodySize;
        kept = std::min(length, limit - std::min(wholeBodyData->size(), limit));
    }
    wholeBodyData->insert(wholeBodyData->end(), bytes, bytes + kept);
}

// The body is held in one block reserved at its first byte. Grown step by
// step instead, it would leave the smaller blocks behind with the allocator,
// still resident, and take twice its size. The block's pages are touched only
// as the body arrives.
size_t HttpTransfer::bodyCapacity(bool errorAnswer) const {
    long long capacity = maxBodySize;
    if (errorAnswer) {
        const long long kept = static_cast<long long>(HttpConnection::kMaxKeptErrorBodySize);
        capacity = capacity > 0 ? std::min(capacity, kept) : kept;
    }
    // libcurl delivers no more than a Content-Length announces.
    const long long announced = head.toResponse().getContentLength();
    if (announced >= 0 && (capacity <= 0 || announced < capacity)) {
        capacity = announced;
    }
    return static_cast<size_t>(std::max(0LL, capacity));
}

size_t HttpTransfer::onUploadRead(char* buffer, size_t size, size_t count, void* self) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    size_t capacity = size * count;
    transfer->touch();
    if (!transfer->bodyStream) {
        const std::string& body = transfer->request->getFixedBody();
        size_t available = transfer->uploadOffset < body.size() ? body.size() - transfer->uploadOffset : 0;
        size_t copied = available < capacity ? available : capacity;
        std::memcpy(buffer, body.data() + transfer->uploadOffset, copied);
        transfer->uploadOffset += copied;
        return copied;
    }
    bool ended = false;
    size_t copied = transfer->bodyStream->read(transfer->uploadOffset, buffer, capacity, ended);
    transfer->uploadOffset += copied;
    if (copied > 0) {
        return copied;
    }
    if (ended) {
        transfer->bodyEnded = true;
        return 0;
    }
    // The writer is behind; the stream wakes us through resumeUpload.
    transfer->uploadPaused = true;
    return CURL_READFUNC_PAUSE;
}

int HttpTransfer::onUploadSeek(void* self, curl_off_t offset, int origin) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    if (origin != SEEK_SET || offset < 0) {
        return CURL_SEEKFUNC_CANTSEEK;
    }
    transfer->uploadOffset = static_cast<size_t>(offset);
    // A resend from the start, on a fresh connection: it leaves anew.
    if (offset == 0) {
        transfer->headersOut = false;
        transfer->bodyBytesOut = 0;
        transfer->bytesOutAfterBodyEnd = 0;
        transfer->bodyEnded = false;
    }
    return CURL_SEEKFUNC_OK;
}

void HttpTransfer::reportSent() {
    if (sentReported) {
        return;
    }
    sentReported = true;
    boost::shared_ptr<NetworkSpeedCollector> target = collector();
    boost::shared_ptr<HttpConnection> owner = connection.lock();
    if (target && owner) {
        target->onRequestSent(id, owner.get());
    }
}

void HttpTransfer::finish(int code) {
    if (finished) {
        return;
    }
    finished = true;
    if (code == HTTP_FINISHED_OK) {
        if (!responseDelivered) {
            deliverResponse();
        }
        if (wholeBodyData && !wholeBodyData->empty()) {
            deliveries->pushBodyData(wholeBodyData);
        }
    }
    wholeBodyData.reset();
    deliveries->pushFinished(code);
    deliveriesQueued = true;
    // The caller hears of the finish before the collector does.
    flushDeliveries();
    boost::shared_ptr<NetworkSpeedCollector> target = collector();
    if (target) {
        target->onRequestFinished(id);
    }
}

}  // namespace Network
