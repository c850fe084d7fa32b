#include "devserver/Server.h"

#include <httplib.h>
#include <sys/socket.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <memory>
#include <mutex>
#include <random>
#include <thread>

#include "devserver/Locator.h"
#include "devserver/StartupAnswer.h"
#include "devserver/StatusPage.h"
#include "devserver/Text.h"
#include "devserver/UploadDecoder.h"
#include "devserver/UploadStore.h"

namespace DevServer {

namespace {

const char kLoopback[] = "127.0.0.1";
const char kXml[] = "text/xml; charset=utf-8";
// Carries the reason of a refusal to the client and tells the request
// logger that the handler has logged it already.
const char kRefusalHeader[] = "X-Devserver-Refusal";
const std::size_t kMaxUuid = 128;
const std::size_t kMaxReason = 300;
// cpp-httplib listens with a backlog of 5, too few for a burst of clients.
const int kListenBacklog = 128;

std::map<std::string, std::string> paramsOf(const httplib::Request& request) {
    std::map<std::string, std::string> params;
    for (const auto& param : request.params) {
        params.emplace(param.first, param.second);
    }
    return params;
}

std::string paramOf(const httplib::Request& request, const char* name) {
    return request.has_param(name) ? request.get_param_value(name) : std::string();
}

std::size_t contentLength(const httplib::Request& request) {
    long long length = 0;
    return Text::parseInteger(request.get_header_value("Content-Length"), 0, 1ll << 50, length)
               ? static_cast<std::size_t>(length)
               : request.body.size();
}

bool isPrintable(const std::string& text) {
    for (unsigned char c : text) {
        if (c < 0x20 || c == 0x7f) {
            return false;
        }
    }
    return true;
}

template <typename Record>
void append(std::vector<Record>& records, Record record, std::size_t limit) {
    records.push_back(std::move(record));
    if (records.size() > limit) {
        records.erase(records.begin(), records.begin() + static_cast<long>(records.size() - limit));
    }
}

std::string joined(const std::vector<std::string>& texts) {
    std::string out;
    for (const std::string& text : texts) {
        out += (out.empty() ? "" : ",") + text;
    }
    return out;
}

}  // namespace

class Server::Impl {
public:
    Impl(Config config, std::string dataFolder)
        : config(std::move(config)),
          locator(this->config),
          decoder(this->config.maxDocumentBytes),
          boundPort(0),
          store(dataFolder),
          storing(!dataFolder.empty()),
          loopEnded(false),
          clients(0),
          random(std::random_device()()) {
        summarySink = [](const std::string& line) {
            std::fprintf(stdout, "%s\n", line.c_str());
            std::fflush(stdout);
        };
        logSink = [](const std::string& line) { std::fprintf(stderr, "%s\n", line.c_str()); };
    }

    bool start(int port);
    void stop();
    std::string baseUrl() const { return "http://127.0.0.1:" + std::to_string(boundPort) + "/"; }

    const Config config;
    const Locator locator;
    const UploadDecoder decoder;
    LineSink summarySink;
    LineSink logSink;
    std::atomic<int> boundPort;

    mutable std::mutex mutex;
    Journal journal;

private:
    void route();
    void onStatusPage(const httplib::Request& request, httplib::Response& response);
    void onStartup(const httplib::Request& request, httplib::Response& response);
    void onPositioning(const httplib::Request& request, httplib::Response& response);
    void onUpload(const httplib::Request& request, httplib::Response& response);
    void onError(const httplib::Request& request, httplib::Response& response);

    void storeUpload(UploadRecord& record);
    std::string newUuid();
    void refuse(const httplib::Request& request, httplib::Response& response, int status,
                const std::string& reason, const std::string& body, const char* contentType);
    void log(const std::string& line);
    void summary(const std::string& line);

    UploadStore store;
    const bool storing;
    std::unique_ptr<httplib::Server> http;
    std::thread loop;
    std::atomic<bool> loopEnded;
    unsigned long clients;
    std::mt19937_64 random;
    std::mutex outputMutex;
};

bool Server::Impl::start(int port) {
    if (http) {
        return false;
    }
    http.reset(new httplib::Server());
    route();
    http->set_payload_max_length(config.maxBodyBytes);
    // Only the listening socket is made with these options, during bind.
    std::shared_ptr<int> listening = std::make_shared<int>(-1);
    http->set_socket_options([listening](socket_t socket) {
        httplib::default_socket_options(socket);
        *listening = socket;
    });
    const int bound = port == 0                             ? http->bind_to_any_port(kLoopback)
                      : http->bind_to_port(kLoopback, port) ? port
                                                            : -1;
    if (bound <= 0) {
        log("devserver: cannot listen on " + std::string(kLoopback) + ":" + std::to_string(port));
        http.reset();
        return false;
    }
    if (*listening >= 0) {
        ::listen(*listening, kListenBacklog);
    }
    boundPort = bound;
    loopEnded = false;
    loop = std::thread([this] {
        http->listen_after_bind();
        loopEnded = true;
    });
    return true;
}

void Server::Impl::stop() {
    if (!http) {
        return;
    }
    // stop() ends only a loop that runs; the loop may not have begun yet.
    while (!http->is_running() && !loopEnded) {
        std::this_thread::yield();
    }
    http->stop();
    loop.join();
    http.reset();
    boundPort = 0;
}

void Server::Impl::route() {
    using httplib::Request;
    using httplib::Response;
    http->Get("/", [this](const Request& request, Response& response) { onStatusPage(request, response); });
    http->Get(R"(/startup/?)",
              [this](const Request& request, Response& response) { onStartup(request, response); });
    http->Get(R"(/cellid_location/?)",
              [this](const Request& request, Response& response) { onPositioning(request, response); });
    http->Post(R"(/wifipool/2\.x/?)",
               [this](const Request& request, Response& response) { onUpload(request, response); });
    http->set_error_handler(
        httplib::Server::HandlerWithResponse([this](const Request& request, Response& response) {
            onError(request, response);
            return httplib::Server::HandlerResponse::Handled;
        }));
}

void Server::Impl::onStatusPage(const httplib::Request&, httplib::Response& response) {
    Journal copy;
    {
        std::lock_guard<std::mutex> lock(mutex);
        copy = journal;
    }
    response.set_content(StatusPage::render(copy, baseUrl()), "text/html; charset=utf-8");
}

void Server::Impl::onStartup(const httplib::Request& request, httplib::Response& response) {
    StartupRecord record;
    record.params = paramsOf(request);
    record.sentUuid = paramOf(request, "uuid");
    if (record.sentUuid.size() > kMaxUuid || !isPrintable(record.sentUuid)) {
        refuse(request, response, 400, "malformed uuid", "malformed uuid\n", "text/plain");
        return;
    }
    std::lock_guard<std::mutex> lock(mutex);
    record.answeredUuid = record.sentUuid.empty() ? newUuid() : record.sentUuid;
    response.set_content(StartupAnswer::build(config, baseUrl(), record.answeredUuid), kXml);
    append(journal.startups, std::move(record), config.journalLimit);
}

void Server::Impl::onPositioning(const httplib::Request& request, httplib::Response& response) {
    PositioningRecord record;
    record.uuid = paramOf(request, "uuid");
    std::string error;
    if (!locator.locate(paramsOf(request), record, error)) {
        record.errorCode = 400;
        record.error = error;
        refuse(request, response, 400, error, "<?xml version=\"1.0\"?>\n<error code=\"400\"/>\n", kXml);
    } else if (record.found) {
        response.set_content("<?xml version=\"1.0\"?>\n<location><coordinates latitude=\"" +
                                 Text::formatFixed(record.latitude, 6) + "\" longitude=\"" +
                                 Text::formatFixed(record.longitude, 6) + "\" accuracy=\"" +
                                 Text::formatFixed(record.accuracy, 1) + "\"/></location>\n",
                             kXml);
    } else {
        response.set_content(
            "<?xml version=\"1.0\"?>\n<error code=\"" + std::to_string(record.errorCode) + "\"/>\n", kXml);
    }
    std::lock_guard<std::mutex> lock(mutex);
    append(journal.positionings, std::move(record), config.journalLimit);
}

void Server::Impl::onUpload(const httplib::Request& request, httplib::Response& response) {
    UploadRecord record;
    record.bytes = contentLength(request);
    const auto data = request.files.find("data");
    decoder.decode(request.get_header_value("Content-Type"),
                   data != request.files.end() ? &data->second.content : nullptr,
                   paramOf(request, "gzip") != "0", record);
    if (record.accepted) {
        storeUpload(record);
    }
    if (record.accepted) {
        response.set_content("ok\n", "text/plain");
    } else {
        record.reason = Text::printable(record.reason).substr(0, kMaxReason);
        refuse(request, response, record.status, record.reason, "refused: " + record.reason + "\n",
               "text/plain");
    }
    std::lock_guard<std::mutex> lock(mutex);
    append(journal.uploads, std::move(record), config.journalLimit);
}

void Server::Impl::storeUpload(UploadRecord& record) {
    std::string error;
    std::lock_guard<std::mutex> lock(mutex);
    if (storing && !store.store(record, error)) {
        record.accepted = false;
        record.status = 500;
        record.reason = error;
        return;
    }
    summary("devserver: upload " +
            (record.storedFile.empty() ? std::string("kept in memory") : record.storedFile) + ": " +
            std::to_string(record.chunks) + " chunks (" + joined(record.chunkTypes) + "), " +
            std::to_string(record.accessPoints) + " access points, " + std::to_string(record.bytes) +
            " bytes, uuid " + Text::printable(record.uuid) + ", model " + Text::printable(record.model));
}

// Requests refused before a handler ran (a body over the limit, a malformed
// multipart body, an unknown path) come here before their answer is written,
// as do the handlers' own refusals, which are logged already.
void Server::Impl::onError(const httplib::Request& request, httplib::Response& response) {
    if (response.has_header(kRefusalHeader)) {
        return;
    }
    const bool upload = request.method == "POST" && request.path.compare(0, 10, "/wifipool/") == 0;
    const std::string reason = response.status == 413
                                   ? "body larger than " + std::to_string(config.maxBodyBytes) + " bytes"
                               : response.status == 404           ? "no such endpoint"
                               : upload && response.status == 400 ? "malformed request or multipart body"
                                                                  : "refused by the HTTP layer";
    refuse(request, response, response.status, reason, "refused: " + reason + "\n", "text/plain");
    if (upload) {
        UploadRecord record;
        record.status = response.status;
        record.reason = reason;
        record.bytes = contentLength(request);
        std::lock_guard<std::mutex> lock(mutex);
        append(journal.uploads, std::move(record), config.journalLimit);
    }
}

// Called under the lock. A fixed prefix numbers clients; otherwise they get
// random version 4 UUIDs.
std::string Server::Impl::newUuid() {
    ++clients;
    if (!config.uuidPrefix.empty()) {
        return config.uuidPrefix + std::to_string(clients);
    }
    const unsigned long long high = random();
    const unsigned long long low = random();
    char text[40];
    std::snprintf(text, sizeof(text), "%08llx-%04llx-4%03llx-%04llx-%012llx", high >> 32,
                  (high >> 16) & 0xffff, high & 0xfff, 0x8000 | ((low >> 48) & 0x3fff),
                  low & 0xffffffffffffull);
    return text;
}

void Server::Impl::refuse(const httplib::Request& request, httplib::Response& response, int status,
                          const std::string& reason, const std::string& body, const char* contentType) {
    const std::string shown = Text::printable(reason).substr(0, kMaxReason);
    response.status = status;
    response.set_header(kRefusalHeader, shown);
    response.set_content(body, contentType);
    log("devserver: refused " + request.method + " " + Text::printable(request.path).substr(0, kMaxReason) +
        " from " + request.remote_addr + ": " + shown + " (HTTP " + std::to_string(status) + ")");
}

void Server::Impl::log(const std::string& line) {
    std::lock_guard<std::mutex> lock(outputMutex);
    logSink(line);
}

void Server::Impl::summary(const std::string& line) {
    if (config.quiet) {
        return;
    }
    std::lock_guard<std::mutex> lock(outputMutex);
    summarySink(line);
}

Server::Server(Config config, std::string dataFolder)
    : impl(new Impl(std::move(config), std::move(dataFolder))) {}

Server::~Server() {
    stop();
}

void Server::setSummarySink(LineSink sink) {
    impl->summarySink = std::move(sink);
}

void Server::setLogSink(LineSink sink) {
    impl->logSink = std::move(sink);
}

bool Server::start(int port) {
    return impl->start(port);
}

void Server::stop() {
    impl->stop();
}

int Server::port() const {
    return impl->boundPort;
}

std::string Server::baseUrl() const {
    return impl->baseUrl();
}

Journal Server::journal() const {
    std::lock_guard<std::mutex> lock(impl->mutex);
    return impl->journal;
}

}  // namespace DevServer
