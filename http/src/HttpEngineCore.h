#pragma once

#include <KD/kd.h>
#include <curl/curl.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/unordered_map.hpp>
#include <vector>

namespace Network {

class HttpTransfer;

// The engine thread and the libcurl multi handle it drives. Other threads
// talk to it only through add, remove and resume, which queue a command and
// wake the thread; everything else runs on the engine thread.
class HttpEngineCore : public boost::enable_shared_from_this<HttpEngineCore> {
public:
    // HttpEngine's lifetime: the first acquire starts the engine, the release
    // matching the last acquire stops it.
    static boost::shared_ptr<HttpEngineCore> acquire();
    static void release();
    // The running engine, or empty.
    static boost::shared_ptr<HttpEngineCore> current();

    ~HttpEngineCore();

    // Any thread. False when the engine is stopping and takes nothing new.
    bool add(const boost::shared_ptr<HttpTransfer>& transfer);
    void remove(const boost::shared_ptr<HttpTransfer>& transfer);
    void resume(const boost::shared_ptr<HttpTransfer>& transfer);

    // Engine thread: the open socket connected from localPort to
    // serverPort, or CURL_SOCKET_BAD. libcurl names a transfer's connection
    // only by its addresses, also when it reuses one.
    curl_socket_t findSocket(long localPort, long serverPort) const;

private:
    struct Command {
        enum Kind { Add, Remove, Resume };
        Kind kind;
        boost::shared_ptr<HttpTransfer> transfer;
    };

    HttpEngineCore();
    HttpEngineCore(const HttpEngineCore&) = delete;
    HttpEngineCore& operator=(const HttpEngineCore&) = delete;

    bool startThread();
    void stopThread();
    bool queue(const Command& command);

    static void* threadMain(void* self);
    static curl_socket_t openSocket(void* self, curlsocktype purpose, curl_sockaddr* address);
    static int closeSocket(void* self, curl_socket_t socket);
    void run();
    // Takes the queued commands; false once the engine is to stop.
    bool takeCommands(std::vector<Command>& taken);
    void execute(const Command& command);
    void startTransfer(const boost::shared_ptr<HttpTransfer>& transfer);
    void cancelTransfer(const boost::shared_ptr<HttpTransfer>& transfer);
    void noteWaitingBytes();
    void completeDoneTransfers();
    void expireSilentTransfers();
    void flushRunningTransfers();
    int pollTimeoutMs();
    void detach(const boost::shared_ptr<HttpTransfer>& transfer);
    void failAll(int code);

    KDThreadMutex* mutex;
    std::vector<Command> commands;
    bool stopping;
    CURLM* multi;
    KDThread* thread;

    // Engine thread only, and the destructor's cleanup of the multi handle.
    boost::unordered_map<CURL*, boost::shared_ptr<HttpTransfer> > running;
    std::vector<curl_socket_t> sockets;
};

}  // namespace Network
