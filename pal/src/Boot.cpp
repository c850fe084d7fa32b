// Start and shutdown hooks, the main loop and kdExit.

#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <atomic>
#include <mutex>
#include <vector>

#include "Runtime.h"
#include "ThreadRecord.h"

namespace {

struct Hook {
    KDPalInitFuncZVR* onInit;
    KDPalShutdownFuncZVR* onShutdown;
    KDint order;
    void* userdata;
    std::uint64_t sequence;
    std::uint64_t startedInCycle = 0;
    std::uint64_t shutDownInCycle = 0;
};

// Hooks are registered from static initialisers, so the registry must exist
// before any of them runs: a function-local static, never destroyed.
struct Hooks {
    std::mutex mutex;
    std::vector<Hook> hooks;
    std::uint64_t nextSequence = 1;
    std::uint64_t cycle = 0;
};

Hooks& hooks() {
    static Hooks* instance = new Hooks();
    return *instance;
}

std::atomic<KDThread*> g_mainThread{nullptr};
std::atomic<bool> g_exitRequested{false};
std::atomic<KDint> g_exitStatus{0};

// Picks the next hook of this cycle not yet run in the given phase. Hooks
// registered while others run (the singleton store registers itself when the
// first singleton appears) are found by the next pick.
const Hook* nextHook(bool starting) {
    Hooks& h = hooks();
    std::lock_guard<std::mutex> lock(h.mutex);
    Hook* best = nullptr;
    for (Hook& hook : h.hooks) {
        const std::uint64_t done = starting ? hook.startedInCycle : hook.shutDownInCycle;
        if (done == h.cycle) {
            continue;
        }
        if (best == nullptr) {
            best = &hook;
            continue;
        }
        const bool earlier = starting ? hook.order > best->order : hook.order < best->order;
        if (earlier || (hook.order == best->order && hook.sequence < best->sequence)) {
            best = &hook;
        }
    }
    if (best == nullptr) {
        return nullptr;
    }
    (starting ? best->startedInCycle : best->shutDownInCycle) = h.cycle;
    static thread_local Hook picked;
    picked = *best;
    return &picked;
}

}  // namespace

namespace pal::detail {

KDThread* mainThread() {
    return g_mainThread.load();
}

void forgetMainThread(KDThread* ending) {
    KDThread* expected = ending;
    g_mainThread.compare_exchange_strong(expected, nullptr);
}

}  // namespace pal::detail

namespace pal {

void start() {
    g_mainThread.store(kdThreadSelf());
    g_exitRequested.store(false);
    g_exitStatus.store(0);
    detail::resetTimerFireCount();
    {
        std::lock_guard<std::mutex> lock(hooks().mutex);
        ++hooks().cycle;
    }
    // After kdExit (a failed start) the remaining start hooks do not run.
    while (!g_exitRequested.load()) {
        const Hook* hook = nextHook(true);
        if (hook == nullptr) {
            break;
        }
        if (hook->onInit != nullptr) {
            hook->onInit(hook->userdata);
        }
    }
}

void shutdown() {
    while (const Hook* hook = nextHook(false)) {
        if (hook->onShutdown != nullptr) {
            hook->onShutdown(hook->userdata);
        }
    }
    // Events left for a finished run must not reach the next one.
    if (KDThread* self = kdThreadSelf()) {
        detail::discardAllEvents(self);
    }
}

int run() {
    start();
    while (!g_exitRequested.load()) {
        const KDEvent* event = kdWaitEvent(static_cast<KDust>(-1));
        kdDefaultEvent(event);
    }
    shutdown();
    return g_exitStatus.load();
}

bool exitRequested() {
    return g_exitRequested.load();
}

int exitStatus() {
    return g_exitStatus.load();
}

}  // namespace pal

extern "C" {

KDint kdAddPalCallbacksZVR(KDPalInitFuncZVR* onInit, KDPalShutdownFuncZVR* onShutdown, KDint order,
                           void* userdata) {
    Hooks& h = hooks();
    std::lock_guard<std::mutex> lock(h.mutex);
    for (const Hook& hook : h.hooks) {
        if (hook.onInit == onInit && hook.onShutdown == onShutdown && hook.order == order &&
            hook.userdata == userdata) {
            return 0;
        }
    }
    Hook hook{onInit, onShutdown, order, userdata, h.nextSequence++};
    // A hook added during a start or shutdown pass belongs to that pass only
    // from the moment it exists: it has not started in this cycle, so a
    // shutdown pass still runs it.
    hook.startedInCycle = h.cycle;
    h.hooks.push_back(hook);
    return 0;
}

void kdExit(KDint status) {
    const bool first = !g_exitRequested.exchange(true);
    if (first) {
        g_exitStatus.store(status);
    }
    KDThread* main = g_mainThread.load();
    if (main != nullptr && main != kdThreadSelf()) {
        KDEvent* quit = kdCreateEvent();
        quit->type = KD_EVENT_QUIT;
        kdPostThreadEvent(quit, main);
    }
}

}  // extern "C"
