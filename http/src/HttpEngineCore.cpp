#include "HttpEngineCore.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <boost/make_shared.hpp>

#include "HttpTransfer.h"
#include "network/HttpFinishCodes.h"

namespace Network {

namespace {

// Upper bound of one poll, so that a missed wake-up costs at most this.
const long kLongestPollMs = 1000;

struct Registry {
    KDThreadMutex* mutex = kdThreadMutexCreate(nullptr);
    boost::shared_ptr<HttpEngineCore> core;
    int users = 0;
    bool curlReady = false;
};

Registry& registry() {
    static Registry instance;
    return instance;
}

long portOf(const sockaddr_storage& address) {
    if (address.ss_family == AF_INET) {
        return ntohs(reinterpret_cast<const sockaddr_in&>(address).sin_port);
    }
    if (address.ss_family == AF_INET6) {
        return ntohs(reinterpret_cast<const sockaddr_in6&>(address).sin6_port);
    }
    return -1;
}

}  // namespace

boost::shared_ptr<HttpEngineCore> HttpEngineCore::acquire() {
    Registry& shared = registry();
    kdThreadMutexLock(shared.mutex);
    if (!shared.curlReady) {
        // Process-wide and never undone: libcurl may not be initialised twice
        // concurrently, and other code of the process may use it too.
        shared.curlReady = curl_global_init(CURL_GLOBAL_DEFAULT) == CURLE_OK;
    }
    if (!shared.core) {
        shared.core.reset(new HttpEngineCore());
        if (!shared.core->startThread()) {
            kdLogMessage("HttpEngine: cannot start the engine thread");
        }
    }
    ++shared.users;
    boost::shared_ptr<HttpEngineCore> core = shared.core;
    kdThreadMutexUnlock(shared.mutex);
    return core;
}

void HttpEngineCore::release() {
    Registry& shared = registry();
    kdThreadMutexLock(shared.mutex);
    boost::shared_ptr<HttpEngineCore> stopped;
    if (--shared.users == 0) {
        stopped.swap(shared.core);
    }
    kdThreadMutexUnlock(shared.mutex);
    if (stopped) {
        stopped->stopThread();
    }
}

boost::shared_ptr<HttpEngineCore> HttpEngineCore::current() {
    Registry& shared = registry();
    kdThreadMutexLock(shared.mutex);
    boost::shared_ptr<HttpEngineCore> core = shared.core;
    kdThreadMutexUnlock(shared.mutex);
    return core;
}

HttpEngineCore::HttpEngineCore()
    : mutex(kdThreadMutexCreate(nullptr)), stopping(false), multi(curl_multi_init()), thread(nullptr) {}

// The multi handle outlives the thread: a thread that queued a command just
// before the stop may still be waking it.
HttpEngineCore::~HttpEngineCore() {
    curl_multi_cleanup(multi);
    kdThreadMutexFree(mutex);
}

bool HttpEngineCore::startThread() {
    if (multi != nullptr) {
        thread = kdThreadCreate(nullptr, &HttpEngineCore::threadMain, this);
    }
    if (thread == nullptr) {
        kdThreadMutexLock(mutex);
        stopping = true;
        kdThreadMutexUnlock(mutex);
        return false;
    }
    return true;
}

void HttpEngineCore::stopThread() {
    kdThreadMutexLock(mutex);
    stopping = true;
    kdThreadMutexUnlock(mutex);
    if (thread != nullptr) {
        curl_multi_wakeup(multi);
        kdThreadJoin(thread, nullptr);
        thread = nullptr;
    }
}

bool HttpEngineCore::add(const boost::shared_ptr<HttpTransfer>& transfer) {
    Command command = {Command::Add, transfer};
    return queue(command);
}

void HttpEngineCore::remove(const boost::shared_ptr<HttpTransfer>& transfer) {
    Command command = {Command::Remove, transfer};
    queue(command);
}

void HttpEngineCore::resume(const boost::shared_ptr<HttpTransfer>& transfer) {
    Command command = {Command::Resume, transfer};
    queue(command);
}

bool HttpEngineCore::queue(const Command& command) {
    kdThreadMutexLock(mutex);
    if (stopping) {
        kdThreadMutexUnlock(mutex);
        return false;
    }
    commands.push_back(command);
    // A non-empty queue has its wake-up on the way already.
    bool wake = commands.size() == 1;
    kdThreadMutexUnlock(mutex);
    if (wake) {
        curl_multi_wakeup(multi);
    }
    return true;
}

void* HttpEngineCore::threadMain(void* self) {
    static_cast<HttpEngineCore*>(self)->run();
    return nullptr;
}

void HttpEngineCore::run() {
    for (;;) {
        std::vector<Command> taken;
        bool keepRunning = takeCommands(taken);
        for (const Command& command : taken) {
            execute(command);
        }
        if (!keepRunning) {
            break;
        }
        noteWaitingBytes();
        int active = 0;
        curl_multi_perform(multi, &active);
        completeDoneTransfers();
        expireSilentTransfers();
        flushRunningTransfers();
        curl_multi_poll(multi, nullptr, 0, pollTimeoutMs(), nullptr);
    }
    failAll(HTTP_NO_ENGINE_ERROR_CODE);
}

bool HttpEngineCore::takeCommands(std::vector<Command>& taken) {
    kdThreadMutexLock(mutex);
    taken.swap(commands);
    bool keepRunning = !stopping;
    kdThreadMutexUnlock(mutex);
    return keepRunning;
}

void HttpEngineCore::execute(const Command& command) {
    switch (command.kind) {
        case Command::Add:
            startTransfer(command.transfer);
            break;
        case Command::Remove:
            cancelTransfer(command.transfer);
            break;
        case Command::Resume:
            if (command.transfer->getHandle() != nullptr) {
                command.transfer->resume();
            }
            break;
    }
}

void HttpEngineCore::startTransfer(const boost::shared_ptr<HttpTransfer>& transfer) {
    // Cancelled before it reached us: nothing to start, nothing to report.
    if (transfer->isCancelled()) {
        return;
    }
    // A fresh handle per transfer: libcurl keeps a handle's last OS error
    // across transfers, and the failure codes tell the socket's errors from
    // the answer's by it. Connections are kept by the multi handle, not here.
    CURL* handle = curl_easy_init();
    if (handle == nullptr) {
        transfer->fail(HTTP_GENERIC_ERROR_CODE);
        transfer->flushDeliveries();
        return;
    }
    // Sockets are made and closed here so that the engine knows which exist
    // (see findSocket).
    curl_easy_setopt(handle, CURLOPT_OPENSOCKETFUNCTION, &HttpEngineCore::openSocket);
    curl_easy_setopt(handle, CURLOPT_OPENSOCKETDATA, this);
    curl_easy_setopt(handle, CURLOPT_CLOSESOCKETFUNCTION, &HttpEngineCore::closeSocket);
    curl_easy_setopt(handle, CURLOPT_CLOSESOCKETDATA, this);
    if (!transfer->open(handle)) {
        transfer->close();
        curl_easy_cleanup(handle);
        return;
    }
    if (curl_multi_add_handle(multi, handle) != CURLM_OK) {
        transfer->fail(HTTP_GENERIC_ERROR_CODE);
        transfer->close();
        curl_easy_cleanup(handle);
        return;
    }
    running[handle] = transfer;
}

curl_socket_t HttpEngineCore::openSocket(void* self, curlsocktype, curl_sockaddr* address) {
    curl_socket_t socket = ::socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
    if (socket != CURL_SOCKET_BAD) {
        static_cast<HttpEngineCore*>(self)->sockets.push_back(socket);
    }
    return socket;
}

int HttpEngineCore::closeSocket(void* self, curl_socket_t socket) {
    HttpEngineCore* core = static_cast<HttpEngineCore*>(self);
    core->sockets.erase(std::remove(core->sockets.begin(), core->sockets.end(), socket), core->sockets.end());
    for (const auto& entry : core->running) {
        entry.second->forgetSocket(socket);
    }
    return ::close(socket);
}

curl_socket_t HttpEngineCore::findSocket(long localPort, long serverPort) const {
    for (curl_socket_t socket : sockets) {
        sockaddr_storage local;
        sockaddr_storage peer;
        socklen_t localLength = sizeof(local);
        socklen_t peerLength = sizeof(peer);
        if (::getsockname(socket, reinterpret_cast<sockaddr*>(&local), &localLength) == 0 &&
            ::getpeername(socket, reinterpret_cast<sockaddr*>(&peer), &peerLength) == 0 &&
            portOf(local) == localPort && portOf(peer) == serverPort) {
            return socket;
        }
    }
    return CURL_SOCKET_BAD;
}

void HttpEngineCore::cancelTransfer(const boost::shared_ptr<HttpTransfer>& transfer) {
    if (transfer->getHandle() == nullptr) {
        return;
    }
    transfer->abandon();
    detach(transfer);
}

void HttpEngineCore::completeDoneTransfers() {
    int left = 0;
    while (CURLMsg* message = curl_multi_info_read(multi, &left)) {
        if (message->msg != CURLMSG_DONE) {
            continue;
        }
        boost::unordered_map<CURL*, boost::shared_ptr<HttpTransfer> >::iterator found =
            running.find(message->easy_handle);
        if (found == running.end()) {
            continue;
        }
        boost::shared_ptr<HttpTransfer> transfer = found->second;
        // The message dies with the handle's removal: read it first.
        CURLcode result = message->data.result;
        transfer->complete(result);
        detach(transfer);
    }
}

// Bytes of an answer's head that libcurl is about to read restart the
// transfer's silence timeout, even before they make up a whole line.
void HttpEngineCore::noteWaitingBytes() {
    std::vector<pollfd> sockets;
    std::vector<HttpTransfer*> owners;
    for (const auto& entry : running) {
        curl_socket_t socket = entry.second->isAwaitingAnswer() ? entry.second->getSocket() : CURL_SOCKET_BAD;
        if (socket != CURL_SOCKET_BAD) {
            pollfd waiting = {socket, POLLIN, 0};
            sockets.push_back(waiting);
            owners.push_back(entry.second.get());
        }
    }
    if (sockets.empty() || ::poll(sockets.data(), sockets.size(), 0) <= 0) {
        return;
    }
    for (std::size_t i = 0; i < sockets.size(); ++i) {
        if (sockets[i].revents != 0) {
            owners[i]->touch();
        }
    }
}

void HttpEngineCore::expireSilentTransfers() {
    HttpTransfer::Clock::time_point now = HttpTransfer::Clock::now();
    std::vector<boost::shared_ptr<HttpTransfer> > expired;
    for (const auto& entry : running) {
        if (entry.second->isExpired(now)) {
            expired.push_back(entry.second);
        }
    }
    for (const boost::shared_ptr<HttpTransfer>& transfer : expired) {
        transfer->expire();
        detach(transfer);
    }
}

void HttpEngineCore::flushRunningTransfers() {
    for (const auto& entry : running) {
        entry.second->flushDeliveries();
    }
}

int HttpEngineCore::pollTimeoutMs() {
    long wait = -1;
    curl_multi_timeout(multi, &wait);
    if (wait < 0 || wait > kLongestPollMs) {
        wait = kLongestPollMs;
    }
    HttpTransfer::Clock::time_point now = HttpTransfer::Clock::now();
    for (const auto& entry : running) {
        HttpTransfer::Clock::time_point deadline;
        if (!entry.second->getDeadline(deadline)) {
            continue;
        }
        // Rounded up, so the poll does not end just short of the deadline.
        long untilDeadline = static_cast<long>(
            std::chrono::duration_cast<std::chrono::milliseconds>(deadline - now).count() + 1);
        wait = std::max(0L, std::min(wait, untilDeadline));
    }
    return static_cast<int>(wait);
}

void HttpEngineCore::detach(const boost::shared_ptr<HttpTransfer>& transfer) {
    CURL* handle = transfer->getHandle();
    curl_multi_remove_handle(multi, handle);
    running.erase(handle);
    transfer->close();
    curl_easy_cleanup(handle);
}

void HttpEngineCore::failAll(int code) {
    std::vector<boost::shared_ptr<HttpTransfer> > remaining;
    for (const auto& entry : running) {
        remaining.push_back(entry.second);
    }
    for (const boost::shared_ptr<HttpTransfer>& transfer : remaining) {
        transfer->fail(code);
        detach(transfer);
    }
}

}  // namespace Network
