#pragma once

namespace Network {

class DataChunk;
class HttpConnection;

// Receives the HTTP engine's measurements of one request, keyed by the id the
// connection was made with. Called on the engine thread; the pointers are
// valid only during the call.
class NetworkSpeedCollector {
public:
    virtual ~NetworkSpeedCollector() {}
    // Once per connection: when the request, head and body, has been written
    // to the socket, whether an answer follows or not, or at the latest when
    // the answer's head arrives (its size is then known through the
    // connection).
    virtual void onRequestSent(int id, HttpConnection* connection) = 0;
    virtual void onRequestFinished(int id) = 0;
    // One block of response body as it arrived from the socket.
    virtual void onDataChunkReceived(int id, DataChunk* dataChunk) = 0;
    virtual void onRequestCanceled(int id) = 0;
};

}  // namespace Network
