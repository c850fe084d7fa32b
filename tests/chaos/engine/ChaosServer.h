#pragma once

#include <string>

#include "support/TestHttpServer.h"

// The loopback servers the scenario's application talks to: one real HTTP
// server whose first path segment chooses how it answers, and a port where
// nobody listens. The same paths serve the scenario's own tasks ("task"),
// network positioning ("cellid_location/"), statistics uploads
// ("wifipool/2.x/") and the startup document ("startup"), so a host switched
// to another answer changes them all.
class ChaosServer {
public:
    enum Answer {
        Ok,           // 200 with a body
        Slow,         // 200 after a short real-time pause, in small chunks
        Cut,          // the connection drops in the middle of the body
        Wrong,        // 200 with a body that is not what the client expects
        ServerError,  // 503
        Refused,      // nobody listens
        AnswerCount
    };

    ChaosServer();

    // "http://127.0.0.1:<port>/<answer>/", the host of every path above.
    std::string host(Answer answer) const;
    std::size_t requestCount() const { return server.requestCount(); }

    static const char* const kTaskPath;

private:
    ChaosServer(const ChaosServer&) = delete;
    ChaosServer& operator=(const ChaosServer&) = delete;

    void script(Answer answer, const std::string& path, const TestHttpServer::Reply& reply);

    TestHttpServer server;
    int refusingPort;
};
