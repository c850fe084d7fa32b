#include "HttpTransfer.h"

#include <KD/kdext.h>
#include <strings.h>

#include <boost/make_shared.hpp>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "HttpEngineCore.h"
#include "network/HttpConnection.h"
#include "network/HttpFinishCodes.h"

namespace Network {

namespace {

const long kMaxRedirects = 10;

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

std::string trimmed(const std::string& text) {
    std::size_t first = text.find_first_not_of(" \t");
    if (first == std::string::npos) {
        return std::string();
    }
    std::size_t last = text.find_last_not_of(" \t");
    return text.substr(first, last - first + 1);
}

bool isFollowedRedirect(int statusCode) {
    return statusCode >= 300 && statusCode < 400 && statusCode != 304;
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
                           const boost::shared_ptr<HttpDeliveryQueue>& deliveries,
                           const boost::weak_ptr<HttpConnection>& connection)
    : request(request),
      id(id),
      speedCollector(speedCollector),
      wholeBody(wholeBody),
      deliveries(deliveries),
      connection(connection),
      bodyStream(request->hasFixedBody() ? boost::shared_ptr<HttpRequest::HttpBodyStream>()
                                         : request->findBodyStream()),
      requestSize(0),
      handle(nullptr),
      headerList(nullptr),
      uploadOffset(0),
      uploadPaused(false),
      statusCode(0),
      skippingBlock(false),
      responseDelivered(false),
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
    setMethodAndBody();
    setHeaders();
    return true;
}

void HttpTransfer::setMethodAndBody() {
    const std::string& method = request->getMethod();
    bool hasBody = request->hasFixedBody() || bodyStream;
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
    curl_easy_setopt(handle, CURLOPT_POSTFIELDSIZE_LARGE,
                     sizeKnown ? static_cast<curl_off_t>(size) : static_cast<curl_off_t>(-1));
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

void HttpTransfer::resumeUpload() {
    if (uploadPaused) {
        uploadPaused = false;
        curl_easy_pause(handle, CURLPAUSE_CONT);
    }
}

bool HttpTransfer::isExpired(Clock::time_point now) const {
    Clock::time_point deadline;
    return getDeadline(deadline) && now >= deadline;
}

bool HttpTransfer::getDeadline(Clock::time_point& deadline) const {
    if (request->getTimeoutMs() <= 0) {
        return false;
    }
    deadline = lastActivity + std::chrono::milliseconds(request->getTimeoutMs());
    return true;
}

void HttpTransfer::complete(CURLcode result) {
    if (result == CURLE_OK) {
        finish(HTTP_FINISHED_OK);
        return;
    }
    char* serverAddress = nullptr;
    curl_easy_getinfo(handle, CURLINFO_PRIMARY_IP, &serverAddress);
    bool reachedServer = serverAddress != nullptr && serverAddress[0] != '\0';
    int code = codeUnlessOffline(classify(result, reachedServer));
    kdLogFormatMessage("HttpConnection %d: failed with %d: %s", id, code,
                       errorText[0] != '\0' ? errorText : curl_easy_strerror(result));
    finish(code);
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
}

// The request is about to leave on an open connection: the server's time to
// answer starts now, not when connecting started.
int HttpTransfer::onConnected(void* self, char*, char*, int, int) {
    static_cast<HttpTransfer*>(self)->touch();
    return CURL_PREREQFUNC_OK;
}

size_t HttpTransfer::onHeaderLine(char* data, size_t size, size_t count, void* self) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    size_t length = size * count;
    transfer->touch();
    transfer->reportSent();
    // Lines after the response was handed over are trailers: not kept.
    if (transfer->responseDelivered) {
        return length;
    }
    std::string line(data, length);
    while (!line.empty() && (line.back() == '\n' || line.back() == '\r')) {
        line.pop_back();
    }
    if (line.empty()) {
        transfer->headerBlockEnded();
    } else {
        transfer->headerLine(line);
    }
    return length;
}

void HttpTransfer::headerLine(const std::string& line) {
    if (line.compare(0, 5, "HTTP/") == 0) {
        // A new status line starts a new answer (after a redirect or an
        // interim 1xx).
        std::size_t codeStart = line.find(' ');
        statusCode = codeStart != std::string::npos ? std::atoi(line.c_str() + codeStart + 1) : 0;
        std::size_t reasonStart =
            codeStart != std::string::npos ? line.find(' ', codeStart + 1) : std::string::npos;
        reasonPhrase =
            reasonStart != std::string::npos ? trimmed(line.substr(reasonStart + 1)) : std::string();
        responseHeaders.clear();
        skippingBlock = false;
        return;
    }
    if ((line[0] == ' ' || line[0] == '\t') && !responseHeaders.empty()) {
        responseHeaders.back().second += " " + trimmed(line);
        return;
    }
    std::size_t colon = line.find(':');
    if (colon == std::string::npos) {
        return;
    }
    responseHeaders.push_back(
        std::make_pair(trimmed(line.substr(0, colon)), trimmed(line.substr(colon + 1))));
}

void HttpTransfer::headerBlockEnded() {
    bool interim = statusCode >= 100 && statusCode < 200;
    bool redirected = request->getFollowRedirects() && isFollowedRedirect(statusCode) &&
                      !HttpResponse(statusCode, reasonPhrase, responseHeaders).getHeader("Location").empty();
    skippingBlock = interim || redirected;
    if (!skippingBlock) {
        deliverResponse();
    }
}

void HttpTransfer::deliverResponse() {
    responseDelivered = true;
    deliveries->pushResponse(boost::make_shared<HttpResponse>(statusCode, reasonPhrase, responseHeaders));
    deliveriesQueued = true;
}

size_t HttpTransfer::onBodyBytes(char* data, size_t size, size_t count, void* self) {
    HttpTransfer* transfer = static_cast<HttpTransfer*>(self);
    size_t length = size * count;
    transfer->touch();
    if (transfer->skippingBlock) {
        return length;
    }
    if (!transfer->responseDelivered) {
        transfer->deliverResponse();
    }
    const unsigned char* bytes = reinterpret_cast<const unsigned char*>(data);
    boost::shared_ptr<NetworkSpeedCollector> target = transfer->collector();
    boost::shared_ptr<DataChunk> chunk;
    if (!transfer->wholeBody || target) {
        chunk = boost::make_shared<DataChunk>(bytes, length);
    }
    if (target) {
        target->onDataChunkReceived(transfer->id, chunk.get());
    }
    if (!transfer->wholeBody) {
        transfer->deliveries->pushBodyData(chunk);
        transfer->deliveriesQueued = true;
        return length;
    }
    if (!transfer->wholeBodyData) {
        transfer->wholeBodyData = boost::make_shared<DataChunk>();
    }
    transfer->wholeBodyData->insert(transfer->wholeBodyData->end(), bytes, bytes + length);
    return length;
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
    if (copied > 0 || ended) {
        return copied;
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
    return CURL_SEEKFUNC_OK;
}

void HttpTransfer::reportSent() {
    if (sentReported) {
        return;
    }
    sentReported = true;
    updateRequestSize();
    boost::shared_ptr<NetworkSpeedCollector> target = collector();
    boost::shared_ptr<HttpConnection> owner = connection.lock();
    if (target && owner) {
        target->onRequestSent(id, owner.get());
    }
}

void HttpTransfer::updateRequestSize() {
    if (handle == nullptr) {
        return;
    }
    long headerBytes = 0;
    curl_off_t bodyBytes = 0;
    curl_easy_getinfo(handle, CURLINFO_REQUEST_SIZE, &headerBytes);
    curl_easy_getinfo(handle, CURLINFO_SIZE_UPLOAD_T, &bodyBytes);
    requestSize.store(static_cast<long long>(headerBytes) + static_cast<long long>(bodyBytes));
}

void HttpTransfer::finish(int code) {
    if (finished) {
        return;
    }
    finished = true;
    updateRequestSize();
    if (code == HTTP_FINISHED_OK) {
        if (!responseDelivered) {
            deliverResponse();
        }
        if (wholeBodyData && !wholeBodyData->empty()) {
            deliveries->pushBodyData(wholeBodyData);
        }
    }
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
