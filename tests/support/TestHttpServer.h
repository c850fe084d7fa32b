#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

// A real HTTP server on 127.0.0.1 and a free port, for tests that need a
// peer: each path is scripted with the answer to give (status, headers,
// body, chunking, a delay, a stall, a connection dropped mid-body, an echo of
// the request body), and every request received is recorded.
//
// Script and read it from the test thread; the server answers on its own
// threads. Delays and stalls are real time (the server is a real peer): keep
// them short and never assert on durations. The destructor releases stalls
// and stops the server.
class TestHttpServer {
public:
    struct Reply {
        enum Mode {
            Whole,             // the body with a Content-Length
            Chunked,           // the body in chunks of chunkSize bytes
            DropMidBody,       // announces the body's length, sends half of it, closes
            StallBeforeReply,  // answers nothing until releaseStalls()
            StallMidBody,      // sends the headers and half the body, then waits as above
            DropAfterStall,    // waits as StallBeforeReply, then answers as DropMidBody
            Echo,              // the request body back, with the request's Content-Type
            Repeated           // the body chunked, repeatCount times over, or until the client leaves
        };
        Mode mode = Whole;
        int status = 200;
        std::string body;
        std::string contentType = "text/plain";
        std::vector<std::pair<std::string, std::string> > headers;
        std::size_t chunkSize = 1024;
        std::size_t repeatCount = 1;
        // Real-time pause before the answer starts.
        int delayMs = 0;
    };

    struct Part {
        std::string name;
        std::string fileName;
        std::string contentType;
        std::string content;
    };

    struct Received {
        std::string method;
        std::string path;
        // Path and query as the client sent them.
        std::string target;
        std::string body;
        std::multimap<std::string, std::string> headers;
        // Filled when the body was multipart/form-data.
        std::vector<Part> parts;

        std::string header(const std::string& name) const;
        const Part* part(const std::string& name) const;
    };

    struct Options {
        int threads = 16;
        // Requests served per connection before the server closes it; 1 frees
        // a server thread after every answer, for many simultaneous clients.
        int keepAliveMaxCount = 100;
        // How long a server thread waits for the next request on a connection, the first one
        // included, before it closes the connection. Short, because a server thread that waits
        // on a client's idle connection holds up the server's shutdown that long; many clients
        // starting at once on a loaded machine need longer before each sends its request.
        int keepAliveTimeoutSeconds = 1;
    };

    TestHttpServer();
    explicit TestHttpServer(const Options& options);
    ~TestHttpServer();

    int port() const { return boundPort; }
    // "http://127.0.0.1:<port>" + path.
    std::string url(const std::string& path) const;

    // Scripts the answer for one path (any method); unscripted paths get 404.
    void on(const std::string& path, const Reply& reply);
    // Ends every stall now and makes later ones end at once.
    void releaseStalls();

    std::vector<Received> received() const;
    std::size_t requestCount() const;

    // A loopback port with nobody listening (connections are refused).
    static int closedPort();

private:
    class Impl;

    TestHttpServer(const TestHttpServer&) = delete;
    TestHttpServer& operator=(const TestHttpServer&) = delete;

    std::unique_ptr<Impl> impl;
    int boundPort;
    std::thread serverThread;
};
