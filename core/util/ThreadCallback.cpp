#include "util/ThreadCallback.h"

namespace Util {

// The record handed over with the event. The links put it on the owner's
// pending list so that a ThreadCallback destroyed with calls still queued can
// free them.
struct ThreadCallback::PostedCall {
    Function function;
    boost::shared_ptr<Context> context;
    PostedCall* previous;
    PostedCall* next;
};

ThreadCallback::ThreadCallback()
    : thread(kdThreadSelf()), pendingMutex(kdThreadMutexCreate(nullptr)), pending(nullptr) {
    kdInstallCallback(&ThreadCallback::callbackWrapper, KD_EVENT_USER, this);
}

ThreadCallback::~ThreadCallback() {
    KD_ASSERT(kdThreadSelf() == thread);
    // Removing the binding discards our events still queued; their records
    // are only reachable through the pending list now.
    kdInstallCallback(nullptr, KD_EVENT_USER, this);
    kdThreadMutexLock(pendingMutex);
    while (pending != nullptr) {
        PostedCall* call = pending;
        pending = call->next;
        delete call;
    }
    kdThreadMutexUnlock(pendingMutex);
    kdThreadMutexFree(pendingMutex);
}

void ThreadCallback::asyncPerformIfDifferentThread(Function function,
                                                   const boost::shared_ptr<Context>& context) {
    if (kdThreadSelf() == thread) {
        function(context);
        return;
    }
    asyncPerform(function, context);
}

void ThreadCallback::asyncPerform(Function function, const boost::shared_ptr<Context>& context) {
    PostedCall* call = new PostedCall{function, context, nullptr, nullptr};
    link(call);
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->userptr = this;
    event->timestamp = kdGetTimeUST();
    event->data.p[0] = call;
    kdPostThreadEvent(event, thread);
}

void ThreadCallback::callbackWrapper(const KDEvent* event) {
    ThreadCallback* self = static_cast<ThreadCallback*>(event->userptr);
    PostedCall* call = static_cast<PostedCall*>(event->data.p[0]);
    self->unlink(call);
    // The call may destroy self; the record is ours alone by now.
    call->function(call->context);
    delete call;
}

void ThreadCallback::link(PostedCall* call) {
    kdThreadMutexLock(pendingMutex);
    call->next = pending;
    if (pending != nullptr) {
        pending->previous = call;
    }
    pending = call;
    kdThreadMutexUnlock(pendingMutex);
}

void ThreadCallback::unlink(PostedCall* call) {
    kdThreadMutexLock(pendingMutex);
    if (call->previous != nullptr) {
        call->previous->next = call->next;
    } else {
        pending = call->next;
    }
    if (call->next != nullptr) {
        call->next->previous = call->previous;
    }
    kdThreadMutexUnlock(pendingMutex);
}

}  // namespace Util
