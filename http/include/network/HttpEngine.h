#pragma once

#include <boost/shared_ptr.hpp>

namespace Network {

class HttpEngineCore;

// Keeps the HTTP engine running: one engine thread that drives every
// HttpConnection's transfer. Connections work while an engine exists;
// several engines at once share one thread. Destroying the last one stops
// the thread, and connections still running finish with
// HTTP_NO_ENGINE_ERROR_CODE. Create and destroy on one thread.
class HttpEngine {
public:
    HttpEngine();
    ~HttpEngine();

private:
    HttpEngine(const HttpEngine&) = delete;
    HttpEngine& operator=(const HttpEngine&) = delete;

    boost::shared_ptr<HttpEngineCore> core;
};

}  // namespace Network
