#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>

#include "util/callback.h"

namespace Util {

// Runs calls on the thread that created it (the owner), which must pump
// platform events. asyncPerformIfDifferentThread may be called from any
// thread; construct and destroy on the owner thread, after every other thread
// has stopped calling it.
class ThreadCallback {
public:
    // Carries the arguments of a deferred call; derive from it.
    class Context {
    public:
        virtual ~Context() {}
    };

    typedef callback<void (*)(boost::shared_ptr<Context>)> Function;

    ThreadCallback();
    // Calls still queued are dropped without running, and their contexts
    // released.
    ~ThreadCallback();

    KDThread* getThread() const { return thread; }

    // On the owner thread, runs function(context) before returning; elsewhere
    // queues it for the owner thread and returns at once.
    void asyncPerformIfDifferentThread(Function function, const boost::shared_ptr<Context>& context);
    // Queues function(context) for the owner thread even when called there,
    // so that calls from several threads keep one order. Any thread.
    void asyncPerform(Function function, const boost::shared_ptr<Context>& context);

    static void callbackWrapper(const KDEvent* event);

private:
    struct PostedCall;

    ThreadCallback(const ThreadCallback&) = delete;
    ThreadCallback& operator=(const ThreadCallback&) = delete;

    void link(PostedCall* call);
    void unlink(PostedCall* call);

    KDThread* thread;
    // Calls posted and not yet delivered; the event carries the same pointer.
    KDThreadMutex* pendingMutex;
    PostedCall* pending;
};

}  // namespace Util
