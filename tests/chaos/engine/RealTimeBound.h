#pragma once

#include <KD/kd.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

// Bounds a wait of the main thread for something real (a loopback answer):
// on the virtual clock kdWaitEvent waits for an event only, so once the
// bound has passed a helper thread posts one and marks the bound expired.
// The waiter then fails loudly instead of hanging. Made and destroyed on the
// waiting thread.
class RealTimeBound {
public:
    explicit RealTimeBound(std::chrono::milliseconds bound);
    ~RealTimeBound();

    bool expired() const { return hasExpired.load(); }

private:
    RealTimeBound(const RealTimeBound&) = delete;
    RealTimeBound& operator=(const RealTimeBound&) = delete;

    void watch(std::chrono::milliseconds bound);

    KDThread* waiter;
    std::mutex mutex;
    std::condition_variable released;
    bool done;
    std::atomic<bool> hasExpired;
    std::thread watcher;
};
