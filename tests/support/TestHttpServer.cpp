#include "support/TestHttpServer.h"

#include <arpa/inet.h>
#include <httplib.h>
#include <netinet/in.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>

namespace {

const std::chrono::seconds kLongestStall(30);

}  // namespace

// ThreadSanitizer reads this hook at start. Debian's cpp-httplib is not built
// with the sanitizer, so accesses it makes from its own threads (to its
// thread-local buffers among others) cannot be ordered and show up as races
// that are not ours.
extern "C" const char* __tsan_default_suppressions() {
    return "race:libcpp-httplib.so\n";
}

class TestHttpServer::Impl {
public:
    explicit Impl(const Options& options);

    int bind();
    void run() { server.listen_after_bind(); }
    // stop() only stops a server whose loop runs.
    void waitUntilRunning();
    void stop();

    void on(const std::string& path, const Reply& reply);
    void releaseStalls();
    std::vector<Received> received() const;

private:
    void handle(const httplib::Request& request, httplib::Response& response);
    void record(const httplib::Request& request);
    bool findReply(const std::string& path, Reply& reply);
    // True when released, false when the bound ran out.
    bool waitForRelease();
    void answer(const Reply& reply, const httplib::Request& request, httplib::Response& response);

    httplib::Server server;
    int listeningSocket = -1;
    mutable std::mutex mutex;
    std::condition_variable released;
    bool stallsReleased = false;
    std::map<std::string, Reply> replies;
    std::vector<Received> requests;
};

TestHttpServer::Impl::Impl(const Options& options) {
    int threads = options.threads;
    server.new_task_queue = [threads] { return new httplib::ThreadPool(threads); };
    server.set_keep_alive_max_count(options.keepAliveMaxCount);
    server.set_keep_alive_timeout(options.keepAliveTimeoutSeconds);
    // Headers and body leave in separate writes; Nagle would hold the body
    // back until the client's delayed ACK.
    server.set_tcp_nodelay(true);
    httplib::Server::Handler handler = [this](const httplib::Request& request, httplib::Response& response) {
        handle(request, response);
    };
    server.Get(".*", handler);
    server.Post(".*", handler);
    server.Put(".*", handler);
    server.Delete(".*", handler);
    server.Patch(".*", handler);
    server.Options(".*", handler);
}

int TestHttpServer::Impl::bind() {
    server.set_socket_options([this](socket_t socket) {
        httplib::default_socket_options(socket);
        listeningSocket = socket;
    });
    int port = server.bind_to_any_port("127.0.0.1");
    // The library listens with a backlog of 5; many clients connecting at
    // once would see their connects dropped and retried for seconds. Linux
    // takes a second listen() as a new backlog.
    if (port > 0) {
        ::listen(listeningSocket, 1024);
    }
    return port;
}

void TestHttpServer::Impl::waitUntilRunning() {
    const auto bound = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!server.is_running() && std::chrono::steady_clock::now() < bound) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
}

void TestHttpServer::Impl::stop() {
    releaseStalls();
    server.stop();
}

void TestHttpServer::Impl::on(const std::string& path, const Reply& reply) {
    std::lock_guard<std::mutex> lock(mutex);
    replies[path] = reply;
}

void TestHttpServer::Impl::releaseStalls() {
    {
        std::lock_guard<std::mutex> lock(mutex);
        stallsReleased = true;
    }
    released.notify_all();
}

std::vector<TestHttpServer::Received> TestHttpServer::Impl::received() const {
    std::lock_guard<std::mutex> lock(mutex);
    return requests;
}

void TestHttpServer::Impl::handle(const httplib::Request& request, httplib::Response& response) {
    record(request);
    Reply reply;
    if (!findReply(request.path, reply)) {
        response.status = 404;
        response.set_content("not found", "text/plain");
        return;
    }
    if (reply.delayMs > 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(reply.delayMs));
    }
    const bool stalls = reply.mode == Reply::StallBeforeReply || reply.mode == Reply::DropAfterStall;
    if (stalls && !waitForRelease()) {
        return;
    }
    answer(reply, request, response);
}

void TestHttpServer::Impl::record(const httplib::Request& request) {
    Received entry;
    entry.method = request.method;
    entry.path = request.path;
    entry.target = request.target;
    entry.body = request.body;
    for (const auto& header : request.headers) {
        entry.headers.insert(std::make_pair(header.first, header.second));
    }
    for (const auto& file : request.files) {
        Part part;
        part.name = file.second.name;
        part.fileName = file.second.filename;
        part.contentType = file.second.content_type;
        part.content = file.second.content;
        entry.parts.push_back(part);
    }
    std::lock_guard<std::mutex> lock(mutex);
    requests.push_back(entry);
}

bool TestHttpServer::Impl::findReply(const std::string& path, Reply& reply) {
    std::lock_guard<std::mutex> lock(mutex);
    auto found = replies.find(path);
    if (found == replies.end()) {
        return false;
    }
    reply = found->second;
    return true;
}

bool TestHttpServer::Impl::waitForRelease() {
    std::unique_lock<std::mutex> lock(mutex);
    return released.wait_for(lock, kLongestStall, [this] { return stallsReleased; });
}

void TestHttpServer::Impl::answer(const Reply& reply, const httplib::Request& request,
                                  httplib::Response& response) {
    response.status = reply.status;
    for (const auto& header : reply.headers) {
        response.set_header(header.first.c_str(), header.second);
    }
    const std::string body = reply.body;
    const std::string contentType = reply.contentType;
    switch (reply.mode) {
        case Reply::Whole:
        case Reply::StallBeforeReply:
            response.set_content(body, contentType.c_str());
            break;
        case Reply::Echo:
            response.set_content(request.body, request.get_header_value("Content-Type").c_str());
            break;
        case Reply::Chunked: {
            std::size_t chunkSize = reply.chunkSize > 0 ? reply.chunkSize : 1;
            response.set_chunked_content_provider(
                contentType, [body, chunkSize](std::size_t offset, httplib::DataSink& sink) {
                    if (offset >= body.size()) {
                        sink.done();
                        return true;
                    }
                    std::size_t count = std::min(chunkSize, body.size() - offset);
                    return sink.write(body.data() + offset, count);
                });
            break;
        }
        case Reply::Repeated: {
            const std::size_t total = body.size() * reply.repeatCount;
            response.set_chunked_content_provider(contentType,
                                                  [body, total](std::size_t offset, httplib::DataSink& sink) {
                                                      if (offset >= total || body.empty()) {
                                                          sink.done();
                                                          return true;
                                                      }
                                                      return sink.write(body.data(), body.size());
                                                  });
            break;
        }
        case Reply::DropMidBody:
        case Reply::DropAfterStall:
            // Returning false from the provider makes the server close the
            // connection short of the announced length.
            response.set_content_provider(body.size(), contentType,
                                          [body](std::size_t offset, std::size_t, httplib::DataSink& sink) {
                                              if (offset > 0) {
                                                  return false;
                                              }
                                              return sink.write(body.data(), body.size() / 2);
                                          });
            break;
        case Reply::StallMidBody:
            response.set_content_provider(
                body.size(), contentType,
                [this, body](std::size_t offset, std::size_t, httplib::DataSink& sink) {
                    if (offset == 0) {
                        return sink.write(body.data(), body.size() / 2);
                    }
                    if (!waitForRelease()) {
                        return false;
                    }
                    return sink.write(body.data() + offset, body.size() - offset);
                });
            break;
    }
}

std::string TestHttpServer::Received::header(const std::string& name) const {
    for (const auto& header : headers) {
        if (strcasecmp(header.first.c_str(), name.c_str()) == 0) {
            return header.second;
        }
    }
    return std::string();
}

const TestHttpServer::Part* TestHttpServer::Received::part(const std::string& name) const {
    for (const Part& candidate : parts) {
        if (candidate.name == name) {
            return &candidate;
        }
    }
    return nullptr;
}

TestHttpServer::TestHttpServer() : TestHttpServer(Options()) {}

TestHttpServer::TestHttpServer(const Options& options) : impl(new Impl(options)), boundPort(impl->bind()) {
    if (boundPort > 0) {
        serverThread = std::thread([this] { impl->run(); });
        impl->waitUntilRunning();
    }
}

TestHttpServer::~TestHttpServer() {
    impl->stop();
    if (serverThread.joinable()) {
        serverThread.join();
    }
}

std::string TestHttpServer::url(const std::string& path) const {
    return "http://127.0.0.1:" + std::to_string(boundPort) + path;
}

void TestHttpServer::on(const std::string& path, const Reply& reply) {
    impl->on(path, reply);
}

void TestHttpServer::releaseStalls() {
    impl->releaseStalls();
}

std::vector<TestHttpServer::Received> TestHttpServer::received() const {
    return impl->received();
}

std::size_t TestHttpServer::requestCount() const {
    return impl->received().size();
}

int TestHttpServer::closedPort() {
    int socketFd = ::socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = 0;
    socklen_t length = sizeof(address);
    int port = 0;
    if (::bind(socketFd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0 &&
        ::getsockname(socketFd, reinterpret_cast<sockaddr*>(&address), &length) == 0) {
        port = ntohs(address.sin_port);
    }
    // Bound but never listening, then closed: the port refuses connections.
    ::close(socketFd);
    return port;
}
