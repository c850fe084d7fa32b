#pragma once

#include <functional>
#include <memory>
#include <string>

#include "devserver/Config.h"
#include "devserver/Journal.h"

namespace DevServer {

// The development server: stands in for the startup, positioning and
// statistics servers on 127.0.0.1, and shows what it received on a status
// page at "/".
//
// Owned and driven (start, stop, setters) by one thread; it serves on threads
// of its own. journal() may be called from any thread.
class Server {
public:
    typedef std::function<void(const std::string& line)> LineSink;

    // dataFolder receives one file per accepted upload and an index of them;
    // empty keeps uploads in the journal only.
    Server(Config config, std::string dataFolder);
    ~Server();

    // Where the one-line summary of each accepted upload goes (stdout unless
    // the config is quiet) and where refusals and failures are logged
    // (stderr). Set before start().
    void setSummarySink(LineSink sink);
    void setLogSink(LineSink sink);

    // Binds 127.0.0.1:port (0: a free port) and serves until stop(). False
    // when the port cannot be bound or the server runs already.
    bool start(int port = 0);
    // Waits for the requests in progress; the destructor stops too.
    void stop();

    // The bound port, 0 when not running.
    int port() const;
    // "http://127.0.0.1:PORT/".
    std::string baseUrl() const;

    Journal journal() const;

private:
    class Impl;

    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;

    std::unique_ptr<Impl> impl;
};

}  // namespace DevServer
