#pragma once

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <vector>

#include "network/HttpRequest.h"
#include "network/HttpResponse.h"

namespace Network {

class NetworkTaskWriter;

// One HTTP exchange a client wants done, submitted to the NetworkManager and
// owned through a shared pointer. Its callbacks run on the thread that
// submitted it.
class NetworkTask {
public:
    // The manager's running state of a submitted task; opaque to the task.
    class State {
    public:
        virtual ~State() {}
    };

    virtual ~NetworkTask() {}

    virtual bool isReadyToPerform() const = 0;
    // 0 (highest) to 3.
    virtual int getPriority() const { return 1; }
    // A fresh request for each attempt.
    virtual boost::shared_ptr<HttpRequest> issueRequest() const = 0;
    virtual bool needToGatherStatistics() const { return true; }
    virtual bool recieveResponseBodyByParts() const { return false; }
    // The most body bytes an answer may have; a longer one fails the attempt
    // with HTTP_BODY_TOO_LARGE_ERROR_CODE. Negative: the engine's default for
    // the body mode; 0: no limit (see HttpConnection::setMaxBodySize).
    virtual long long getMaxResponseBodySize() const { return -1; }
    virtual void onResponseRecieved(boost::shared_ptr<HttpResponse> response) { (void)response; }
    virtual void onBytesReceived(const std::vector<unsigned char>& bytes) = 0;
    // The HTTP status of a completed exchange, else a negative finish code.
    virtual void onFinished(int code) = 0;
    virtual void onRetried() {}

    const boost::weak_ptr<State>& getState() const { return state; }
    void setState(const boost::weak_ptr<State>& newState) { state = newState; }
    // Streams the request body from any thread; set by the manager at
    // submission, empty before.
    const boost::shared_ptr<NetworkTaskWriter>& getWriter() const { return writer; }
    void setWriter(const boost::shared_ptr<NetworkTaskWriter>& newWriter) { writer = newWriter; }

private:
    boost::weak_ptr<State> state;
    boost::shared_ptr<NetworkTaskWriter> writer;
};

// The task's running state as the type the manager made it, or empty when the
// task has none (not submitted, or its state is gone) or it is another type.
template <class T>
boost::shared_ptr<T> getRequestState(const boost::shared_ptr<NetworkTask>& task) {
    if (!task) {
        return boost::shared_ptr<T>();
    }
    return boost::dynamic_pointer_cast<T>(task->getState().lock());
}

}  // namespace Network
