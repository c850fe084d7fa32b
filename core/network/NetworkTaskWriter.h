#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <vector>

#include "network/HttpRequest.h"

namespace Network {

// Streams a task's request body from any thread. Every byte written is kept,
// so each attempt of the task (a retry) sends the whole body again. The
// running state sets the request of each attempt on the caller thread.
class NetworkTaskWriter {
public:
    NetworkTaskWriter();
    ~NetworkTaskWriter();

    void write(const void* data, int size);
    void close();
    // Replays what was written so far (and the end, if closed) into request.
    void setRequest(boost::shared_ptr<HttpRequest> request);

private:
    NetworkTaskWriter(const NetworkTaskWriter&) = delete;
    NetworkTaskWriter& operator=(const NetworkTaskWriter&) = delete;

    boost::shared_ptr<HttpRequest> request;
    bool closed;
    std::vector<char> buffer;
    KDThreadMutex* mutex;
};

}  // namespace Network
