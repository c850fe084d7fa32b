#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

// A loopback peer that answers every connection with fixed raw bytes, for
// answers no HTTP server library would produce: broken framing, a reset
// instead of a close, a head that trickles in byte by byte, or silence after
// a part of the answer.
class RawReplyServer {
public:
    struct Options {
        // Real-time pause between single bytes; 0 sends the answer at once.
        int byteIntervalMs = 0;
        // Ends the connection with a reset (RST) instead of a close.
        bool reset = false;
        // Keeps the connection open and silent after the answer until the
        // server goes away.
        bool stayOpen = false;
    };

    explicit RawReplyServer(const std::string& answer) : RawReplyServer(answer, Options()) {}
    RawReplyServer(const std::string& answer, const Options& options) : answer(answer), options(options) {
        listener = ::socket(AF_INET, SOCK_STREAM, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof(address);
        ::bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof(address));
        ::listen(listener, 8);
        ::getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length);
        port = ntohs(address.sin_port);
        thread = std::thread([this] { serve(); });
    }
    ~RawReplyServer() {
        stopping = true;
        thread.join();
        for (int client : held) {
            ::close(client);
        }
        ::close(listener);
    }
    std::string url() const { return "http://127.0.0.1:" + std::to_string(port) + "/raw"; }

private:
    void serve() {
        while (!stopping) {
            pollfd waiting = {listener, POLLIN, 0};
            if (::poll(&waiting, 1, 20) <= 0) {
                continue;
            }
            int client = ::accept(listener, nullptr, nullptr);
            if (client < 0) {
                continue;
            }
            readRequestHead(client);
            send(client);
            end(client);
        }
    }
    static void readRequestHead(int client) {
        std::string head;
        char buffer[1024];
        while (head.find("\r\n\r\n") == std::string::npos) {
            ssize_t count = ::recv(client, buffer, sizeof(buffer), 0);
            if (count <= 0) {
                return;
            }
            head.append(buffer, static_cast<std::size_t>(count));
        }
    }
    void send(int client) {
        if (options.byteIntervalMs <= 0) {
            ::send(client, answer.data(), answer.size(), MSG_NOSIGNAL);
            return;
        }
        for (std::size_t i = 0; i < answer.size() && !stopping; ++i) {
            ::send(client, answer.data() + i, 1, MSG_NOSIGNAL);
            std::this_thread::sleep_for(std::chrono::milliseconds(options.byteIntervalMs));
        }
    }
    void end(int client) {
        if (options.stayOpen) {
            held.push_back(client);
            return;
        }
        if (options.reset) {
            linger abort = {1, 0};
            ::setsockopt(client, SOL_SOCKET, SO_LINGER, &abort, sizeof(abort));
        }
        ::close(client);
    }

    std::string answer;
    Options options;
    int listener = -1;
    int port = 0;
    std::atomic<bool> stopping{false};
    std::vector<int> held;
    std::thread thread;
};
