#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <vector>

#include "support/PalTest.h"
#include "util/ThreadCallback.h"

namespace {

typedef boost::shared_ptr<Util::ThreadCallback::Context> Context;
typedef std::vector<boost::weak_ptr<Util::ThreadCallback::Context> > Watched;

class NumberContext : public Util::ThreadCallback::Context {
public:
    explicit NumberContext(int number) : number(number) {}
    int number;
};

std::vector<Context> numberedContexts(int count) {
    std::vector<Context> contexts;
    for (int i = 0; i < count; ++i) {
        contexts.push_back(boost::make_shared<NumberContext>(i));
    }
    return contexts;
}

// Receives the calls and remembers where and with what they ran.
class Receiver {
public:
    Receiver() : threadCallback(new Util::ThreadCallback()) {}

    Util::ThreadCallback::Function function() {
        return Util::ThreadCallback::Function::make<Receiver, &Receiver::onCall>(this);
    }

    void onCall(Context context) {
        contexts.push_back(context.get());
        // Read now: the call releases its context, so the pointer above is only an identity.
        const NumberContext* numbered = dynamic_cast<const NumberContext*>(context.get());
        numbers.push_back(numbered != nullptr ? numbered->number : -1);
        threads.push_back(kdThreadSelf());
        if (destroyOnCall) {
            threadCallback.reset();
        }
    }

    // Posts the contexts from a thread of its own; only the posted calls keep them.
    Watched postFromWorker(std::vector<Context> posted) {
        const Watched watched(posted.begin(), posted.end());
        pending.swap(posted);
        KDThread* worker = kdThreadCreate(nullptr, &Receiver::postPending, this);
        EXPECT_NE(nullptr, worker);
        kdThreadJoin(worker, nullptr);
        return watched;
    }

    boost::scoped_ptr<Util::ThreadCallback> threadCallback;
    std::vector<Util::ThreadCallback::Context*> contexts;
    std::vector<int> numbers;
    std::vector<KDThread*> threads;
    bool destroyOnCall = false;
    KDThread* postedFrom = nullptr;

private:
    static void* postPending(void* self) {
        Receiver* receiver = static_cast<Receiver*>(self);
        receiver->postedFrom = kdThreadSelf();
        for (const Context& context : receiver->pending) {
            receiver->threadCallback->asyncPerformIfDifferentThread(receiver->function(), context);
        }
        receiver->pending.clear();
        return nullptr;
    }

    std::vector<Context> pending;
};

bool allExpired(const Watched& watched) {
    for (const auto& context : watched) {
        if (!context.expired()) {
            return false;
        }
    }
    return true;
}

class ThreadCallbackTest : public PalTest {};

}  // namespace

TEST_F(ThreadCallbackTest, CallOnTheOwnerThreadRunsBeforeReturning) {
    Receiver receiver;
    Context context = boost::make_shared<NumberContext>(1);
    receiver.threadCallback->asyncPerformIfDifferentThread(receiver.function(), context);
    ASSERT_EQ(1u, receiver.contexts.size());
    EXPECT_EQ(context.get(), receiver.contexts[0]);
    EXPECT_EQ(kdThreadSelf(), receiver.threads[0]);
    EXPECT_EQ(kdThreadSelf(), receiver.threadCallback->getThread());
}

TEST_F(ThreadCallbackTest, CallsFromAWorkerRunLaterOnTheOwnerInPostingOrderAndReleaseTheirContexts) {
    Receiver receiver;
    std::vector<Context> posted = numberedContexts(50);
    posted.push_back(Context());
    const Watched watched = receiver.postFromWorker(posted);
    posted.clear();
    EXPECT_TRUE(receiver.contexts.empty());
    EXPECT_NE(kdThreadSelf(), receiver.postedFrom);

    pump();
    ASSERT_EQ(51u, receiver.contexts.size());
    for (int i = 0; i < 50; ++i) {
        EXPECT_EQ(i, receiver.numbers[i]);
        EXPECT_EQ(kdThreadSelf(), receiver.threads[i]);
    }
    EXPECT_EQ(nullptr, receiver.contexts[50]);
    EXPECT_TRUE(allExpired(watched));
}

int gLeftoverEvents = 0;
void countLeftoverEvent(const KDEvent*) {
    ++gLeftoverEvents;
}

TEST_F(ThreadCallbackTest, DestroyedWithCallsQueuedRunsNothingAndFreesTheirContexts) {
    Receiver receiver;
    const Watched watched = receiver.postFromWorker(numberedContexts(3));
    EXPECT_FALSE(watched[0].expired());
    void* oldAddress = receiver.threadCallback.get();
    receiver.threadCallback.reset();
    EXPECT_TRUE(allExpired(watched));
    // Whatever is bound to the old address next (a new object may well get it) or as the fallback
    // must never see the old events.
    gLeftoverEvents = 0;
    kdInstallCallback(&countLeftoverEvent, KD_EVENT_USER, oldAddress);
    kdInstallCallback(&countLeftoverEvent, KD_EVENT_USER, nullptr);
    pump();
    kdInstallCallback(nullptr, KD_EVENT_USER, oldAddress);
    kdInstallCallback(nullptr, KD_EVENT_USER, nullptr);
    EXPECT_EQ(0, gLeftoverEvents);
    EXPECT_TRUE(receiver.contexts.empty());
}

TEST_F(ThreadCallbackTest, CallMayDestroyItsThreadCallbackAndTheRestIsDropped) {
    Receiver receiver;
    receiver.destroyOnCall = true;
    const Watched watched = receiver.postFromWorker(numberedContexts(3));
    pump();
    EXPECT_EQ(1u, receiver.contexts.size());
    EXPECT_EQ(nullptr, receiver.threadCallback.get());
    EXPECT_TRUE(allExpired(watched));
}
