// Threads, recursive mutexes, conditions and scheduling classes on pthreads.

#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <sched.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <set>
#include <thread>

#include "Runtime.h"
#include "SimInternal.h"
#include "ThreadRecord.h"

namespace {

// Every live thread record, so that advancing the virtual clock can wake the
// threads waiting on it. Never destroyed: records end during the process's
// exit, after static objects may have gone.
std::mutex& registryMutex() {
    static std::mutex* mutex = new std::mutex();
    return *mutex;
}
std::set<KDThread*>& registry() {
    static std::set<KDThread*>* threads = new std::set<KDThread*>();
    return *threads;
}

void registerThread(KDThread* thread) {
    std::lock_guard<std::mutex> lock(registryMutex());
    registry().insert(thread);
}

thread_local KDThread* t_current = nullptr;
// Set when the thread's adopted record is torn down; trivially destructible,
// so it still reads true while the process's static objects are destroyed.
thread_local bool t_recordEnded = false;

// Records of threads the layer started are owned by kdThreadJoin (or by the
// thread itself when detached); records of other threads by this holder,
// which goes with the thread's thread-local storage.
struct AdoptedRecord {
    KDThread* record = nullptr;
    ~AdoptedRecord() {
        if (record == nullptr) {
            return;
        }
        t_current = nullptr;
        t_recordEnded = true;
        pal::detail::forgetMainThread(record);
        delete record;
    }
};
thread_local AdoptedRecord t_adopted;

void reportCallAfterEnd() {
    static std::atomic<bool> reported{false};
    if (!reported.exchange(true)) {
        pal::detail::writeLogLine(
            "platform call after the calling thread's platform state was torn down: refused");
    }
    kdSetError(KD_EINVAL);
}

void* threadTrampoline(void* argument) {
    KDThread* self = static_cast<KDThread*>(argument);
    t_current = self;
    self->result = self->startRoutine(self->startArgument);
    t_current = nullptr;
    if (self->detached.load()) {
        delete self;
    }
    return nullptr;
}

std::atomic<bool> gCreationRefused{false};

int policyToPosix(KDint policy) {
    return policy == KD_THREAD_POLICY_BACKGROUND_ZVR ? SCHED_IDLE : SCHED_OTHER;
}

// Linux lets any thread into SCHED_IDLE, but only a process with CAP_SYS_NICE
// or an RLIMIT_NICE of 20 may take it out again. Rather than model those
// rules, a throw-away thread tries the round trip, once per process.
bool probeIdleClassIsLeavable() {
    bool leavable = false;
    std::thread probe([&leavable] {
        sched_param posixParam{};
        if (pthread_setschedparam(pthread_self(), SCHED_IDLE, &posixParam) == 0) {
            leavable = pthread_setschedparam(pthread_self(), SCHED_OTHER, &posixParam) == 0;
        }
    });
    probe.join();
    return leavable;
}

bool idleClassIsLeavable() {
    static const bool leavable = probeIdleClassIsLeavable();
    return leavable;
}

}  // namespace

KDThread::~KDThread() {
    {
        std::lock_guard<std::mutex> lock(registryMutex());
        registry().erase(this);
    }
    // A poster that has just handed over our last event may still be
    // signalling us; the condition must outlive that.
    { std::lock_guard<std::mutex> queueLock(queueMutex); }
    while (signalsInProgress.load() != 0) {
        sched_yield();
    }
    pal::detail::orphanTimersOf(this);
    pal::detail::discardAllEvents(this);
    delete lastReturned;
}

namespace pal::detail {

KDThread* currentThread() {
    if (t_current != nullptr) {
        return t_current;
    }
    if (t_recordEnded) {
        reportCallAfterEnd();
        return nullptr;
    }
    t_adopted.record = new KDThread();
    t_adopted.record->handle = pthread_self();
    t_current = t_adopted.record;
    registerThread(t_current);
    return t_current;
}

bool withLiveThread(KDThread* thread, const std::function<void()>& action) {
    std::lock_guard<std::mutex> lock(registryMutex());
    if (registry().count(thread) == 0) {
        return false;
    }
    action();
    return true;
}

void wakeAllThreads() {
    std::lock_guard<std::mutex> lock(registryMutex());
    for (KDThread* thread : registry()) {
        // Taking the queue lock orders the wake-up after a waiter's check.
        { std::lock_guard<std::mutex> queueLock(thread->queueMutex); }
        thread->queueChanged.notify_all();
    }
}

}  // namespace pal::detail

extern "C" {

KDThread* kdThreadCreate(const KDThreadAttr*, void* (*start_routine)(void*), void* arg) {
    if (gCreationRefused.load()) {
        kdSetError(KD_ENOMEM);
        return nullptr;
    }
    KDThread* thread = new KDThread();
    thread->startRoutine = start_routine;
    thread->startArgument = arg;
    registerThread(thread);
    if (pthread_create(&thread->handle, nullptr, threadTrampoline, thread) != 0) {
        delete thread;
        kdSetError(KD_ENOMEM);
        return nullptr;
    }
    return thread;
}

KDint kdThreadJoin(KDThread* thread, void** retval) {
    if (thread == nullptr || pthread_join(thread->handle, nullptr) != 0) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    if (retval != nullptr) {
        *retval = thread->result;
    }
    delete thread;
    return 0;
}

KDint kdThreadDetach(KDThread* thread) {
    if (thread == nullptr) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    thread->detached.store(true);
    pthread_detach(thread->handle);
    return 0;
}

KDThread* kdThreadSelf(void) {
    return pal::detail::currentThread();
}

KDboolean kdThreadIsMainZVR(void) {
    return pal::detail::mainThread() != nullptr && pal::detail::mainThread() == kdThreadSelf();
}

void kdThreadYieldZVR(void) {
    sched_yield();
}

KDint kdThreadGetSchedParamZVR(KDThread* thread, KDint* policy, KDint* param) {
    if (thread == nullptr) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    if (policy != nullptr) {
        *policy = thread->schedPolicy.load();
    }
    if (param != nullptr) {
        *param = thread->schedParam.load();
    }
    return 0;
}

KDint kdThreadSetSchedParamZVR(KDThread* thread, KDint policy, const KDint* param) {
    if (thread == nullptr || param == nullptr ||
        (policy != KD_THREAD_POLICY_NORMAL_ZVR && policy != KD_THREAD_POLICY_BACKGROUND_ZVR)) {
        kdSetError(KD_EINVAL);
        return -1;
    }
    // A thread demoted for good would starve behind every busy process, so
    // the demotion is refused unless it can be undone.
    if (policy == KD_THREAD_POLICY_BACKGROUND_ZVR && thread->schedPolicy.load() != policy &&
        !idleClassIsLeavable()) {
        kdSetError(KD_EACCES);
        return -1;
    }
    // Both Linux classes used here take priority 0; the parameter is kept so
    // that a caller restoring saved parameters gets back what it read.
    sched_param posixParam{};
    posixParam.sched_priority = 0;
    if (pthread_setschedparam(thread->handle, policyToPosix(policy), &posixParam) != 0) {
        kdSetError(KD_EACCES);
        return -1;
    }
    thread->schedPolicy.store(policy);
    thread->schedParam.store(*param);
    return 0;
}

struct KDThreadMutex {
    pthread_mutex_t mutex;
};

struct KDThreadCond {
    pthread_cond_t cond;
};

KDThreadMutex* kdThreadMutexCreate(const void*) {
    KDThreadMutex* mutex = new KDThreadMutex();
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    // Recursive always: the network manager re-locks its mutex on the same thread.
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_RECURSIVE);
    pthread_mutex_init(&mutex->mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
    return mutex;
}

KDint kdThreadMutexFree(KDThreadMutex* mutex) {
    if (mutex == nullptr) {
        return 0;
    }
    pthread_mutex_destroy(&mutex->mutex);
    delete mutex;
    return 0;
}

KDint kdThreadMutexLock(KDThreadMutex* mutex) {
    return pthread_mutex_lock(&mutex->mutex) == 0 ? 0 : -1;
}

KDint kdThreadMutexUnlock(KDThreadMutex* mutex) {
    return pthread_mutex_unlock(&mutex->mutex) == 0 ? 0 : -1;
}

KDThreadCond* kdThreadCondCreate(const void*) {
    KDThreadCond* cond = new KDThreadCond();
    pthread_cond_init(&cond->cond, nullptr);
    return cond;
}

KDint kdThreadCondFree(KDThreadCond* cond) {
    if (cond == nullptr) {
        return 0;
    }
    pthread_cond_destroy(&cond->cond);
    delete cond;
    return 0;
}

KDint kdThreadCondSignal(KDThreadCond* cond) {
    return pthread_cond_signal(&cond->cond) == 0 ? 0 : -1;
}

KDint kdThreadCondBroadcast(KDThreadCond* cond) {
    return pthread_cond_broadcast(&cond->cond) == 0 ? 0 : -1;
}

KDint kdThreadCondWait(KDThreadCond* cond, KDThreadMutex* mutex) {
    return pthread_cond_wait(&cond->cond, &mutex->mutex) == 0 ? 0 : -1;
}

}  // extern "C"

namespace pal {

void setThreadCreationRefused(bool refused) {
    gCreationRefused.store(refused);
}

namespace detail {

void resetThreads() {
    gCreationRefused.store(false);
}

}  // namespace detail
}  // namespace pal
