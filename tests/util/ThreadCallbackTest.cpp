#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <vector>

#include "support/PalTest.h"
#include "util/ThreadCallback.h"

namespace {

class NumberContext : public Util::ThreadCallback::Context {
public:
    explicit NumberContext(int number) : number(number) {}
    int number;
};

// Receives the calls and remembers where and with what they ran.
class Receiver {
public:
    Receiver() : threadCallback(new Util::ThreadCallback()) {}

    Util::ThreadCallback::Function function() {
        return Util::ThreadCallback::Function::make<Receiver, &Receiver::onCall>(this);
    }

    void onCall(boost::shared_ptr<Util::ThreadCallback::Context> context) {
        contexts.push_back(context.get());
        threads.push_back(kdThreadSelf());
        if (destroyOnCall) {
            threadCallback.reset();
        }
    }

    boost::scoped_ptr<Util::ThreadCallback> threadCallback;
    std::vector<Util::ThreadCallback::Context*> contexts;
    std::vector<KDThread*> threads;
    bool destroyOnCall = false;
};

// What a worker thread posts.
struct Job {
    Receiver* receiver;
    std::vector<boost::shared_ptr<Util::ThreadCallback::Context> > contexts;
    KDThread* postedFrom = nullptr;
};

void* postJob(void* argument) {
    Job* job = static_cast<Job*>(argument);
    job->postedFrom = kdThreadSelf();
    for (size_t i = 0; i < job->contexts.size(); ++i) {
        job->receiver->threadCallback->asyncPerformIfDifferentThread(job->receiver->function(),
                                                                     job->contexts[i]);
    }
    return nullptr;
}

void runOnWorker(Job& job) {
    KDThread* worker = kdThreadCreate(nullptr, &postJob, &job);
    ASSERT_NE(nullptr, worker);
    kdThreadJoin(worker, nullptr);
}

std::vector<boost::shared_ptr<Util::ThreadCallback::Context> > numberedContexts(int count) {
    std::vector<boost::shared_ptr<Util::ThreadCallback::Context> > contexts;
    for (int i = 0; i < count; ++i) {
        contexts.push_back(boost::make_shared<NumberContext>(i));
    }
    return contexts;
}

class ThreadCallbackTest : public PalTest {};

}  // namespace

TEST_F(ThreadCallbackTest, CallOnTheOwnerThreadRunsBeforeReturning) {
    Receiver receiver;
    boost::shared_ptr<Util::ThreadCallback::Context> context = boost::make_shared<NumberContext>(1);
    receiver.threadCallback->asyncPerformIfDifferentThread(receiver.function(), context);
    ASSERT_EQ(1u, receiver.contexts.size());
    EXPECT_EQ(context.get(), receiver.contexts[0]);
    EXPECT_EQ(kdThreadSelf(), receiver.threads[0]);
    EXPECT_EQ(kdThreadSelf(), receiver.threadCallback->getThread());
}

TEST_F(ThreadCallbackTest, CallsFromAWorkerRunLaterOnTheOwnerInPostingOrderWithTheirContexts) {
    Receiver receiver;
    Job job{&receiver, numberedContexts(50)};
    job.contexts.push_back(boost::shared_ptr<Util::ThreadCallback::Context>());
    runOnWorker(job);
    EXPECT_TRUE(receiver.contexts.empty());
    EXPECT_NE(kdThreadSelf(), job.postedFrom);

    pump();
    ASSERT_EQ(51u, receiver.contexts.size());
    for (int i = 0; i < 50; ++i) {
        EXPECT_EQ(job.contexts[i].get(), receiver.contexts[i]);
        EXPECT_EQ(i, static_cast<NumberContext*>(receiver.contexts[i])->number);
        EXPECT_EQ(kdThreadSelf(), receiver.threads[i]);
        // The posted record let go of its reference after the call.
        EXPECT_EQ(1, job.contexts[i].use_count());
    }
    EXPECT_EQ(nullptr, receiver.contexts[50]);
}

TEST_F(ThreadCallbackTest, DestroyedWithCallsQueuedRunsNothingAndFreesTheirContexts) {
    Receiver receiver;
    Job job{&receiver, numberedContexts(3)};
    runOnWorker(job);
    std::vector<boost::weak_ptr<Util::ThreadCallback::Context> > watched(job.contexts.begin(),
                                                                         job.contexts.end());
    job.contexts.clear();
    EXPECT_FALSE(watched[0].expired());

    receiver.threadCallback.reset();
    for (size_t i = 0; i < watched.size(); ++i) {
        EXPECT_TRUE(watched[i].expired());
    }
    // A new object at the same address must not receive the old calls.
    receiver.threadCallback.reset(new Util::ThreadCallback());
    pump();
    EXPECT_TRUE(receiver.contexts.empty());
}

TEST_F(ThreadCallbackTest, CallMayDestroyItsThreadCallbackAndTheRestIsDropped) {
    Receiver receiver;
    receiver.destroyOnCall = true;
    Job job{&receiver, numberedContexts(3)};
    runOnWorker(job);
    std::vector<boost::weak_ptr<Util::ThreadCallback::Context> > watched(job.contexts.begin(),
                                                                         job.contexts.end());
    job.contexts.clear();
    pump();
    EXPECT_EQ(1u, receiver.contexts.size());
    EXPECT_EQ(nullptr, receiver.threadCallback.get());
    for (size_t i = 0; i < watched.size(); ++i) {
        EXPECT_TRUE(watched[i].expired());
    }
}
