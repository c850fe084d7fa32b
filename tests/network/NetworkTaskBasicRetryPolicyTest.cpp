// Retry waits on the virtual clock against a real server that keeps failing.
// Each wait is checked to the millisecond: nothing a millisecond before it
// ends, the next attempt when it ends.
#include <ctime>

#include "NetworkTest.h"
#include "network/RetryJitter.h"

using Network::NetworkTaskBasicRetryPolicy;

namespace {

const unsigned long long kSeed = 20261207;

// An HTTP date as servers write it, by the C library.
std::string httpDate(long long epochSeconds) {
    const std::time_t time = static_cast<std::time_t>(epochSeconds);
    std::tm broken = {};
    gmtime_r(&time, &broken);
    char text[64];
    std::strftime(text, sizeof(text), "%a, %d %b %Y %H:%M:%S GMT", &broken);
    return text;
}

}  // namespace

class NetworkTaskBasicRetryPolicyTest : public NetworkTest {
protected:
    // The server answers status, with a Retry-After when one is given.
    void answer(int status, const std::string& retryAfter = "") {
        Reply reply;
        reply.status = status;
        reply.body = "busy";
        if (!retryAfter.empty()) {
            reply.headers = {{"Retry-After", retryAfter}};
        }
        server->on("/down", reply);
    }

    Task submitFailing(int retryInterval, int maxRetries) {
        Task task = makeTask(server->url("/down"));
        manager->submit(
            task, boost::make_shared<NetworkTaskBasicRetryPolicy>(retryInterval, maxRetries, false, kSeed));
        return task;
    }

    void untilWaiting(const Task& task) {
        boost::shared_ptr<Network::NetworkTaskImpl> state = stateOf(task);
        pumpUntil([&] { return task->finished() || state->isWaitingForRetry(); });
    }

    // The task, waiting for its retry, makes its next attempt exactly waitMs
    // from now, and is waiting again afterwards.
    void expectNextAttemptAfter(const Task& task, long long waitMs) {
        untilWaiting(task);
        const int attempts = task->attempts;
        advanceMs(waitMs - 1);
        EXPECT_EQ(attempts, task->attempts) << "retried before " << waitMs << " ms";
        advanceMs(1);
        EXPECT_EQ(attempts + 1, task->attempts) << "not retried at " << waitMs << " ms";
        untilWaiting(task);
    }
};

TEST_F(NetworkTaskBasicRetryPolicyTest,
       UnlimitedRetriesWaitTheFirstIntervalThenJitteredDoublingWaitsUpToTheCap) {
    answer(503);
    Task task = submitFailing(1000, -1);
    Network::RetryJitter expected(kSeed);
    std::vector<long long> cappedWaits;
    long long ceiling = 1000;
    for (int retry = 0; retry < 14; ++retry) {
        const long long wait = expected.between(1000, ceiling);
        EXPECT_GE(wait, 1000);
        EXPECT_LE(wait, ceiling);
        expectNextAttemptAfter(task, wait);
        if (ceiling == NetworkTaskBasicRetryPolicy::MAX_BACKOFF_INTERVAL_MS) {
            cappedWaits.push_back(wait);
        }
        ceiling = std::min<long long>(ceiling * 2, NetworkTaskBasicRetryPolicy::MAX_BACKOFF_INTERVAL_MS);
    }
    // 1, 2, 4 ... 64 s, then the cap of 120 s from the eighth wait on.
    EXPECT_EQ(7u, cappedWaits.size());
    EXPECT_NE(cappedWaits.front(), cappedWaits.back()) << "waits at the cap are jittered too";
    EXPECT_FALSE(task->finished());
    manager->cancel(task);
}

TEST_F(NetworkTaskBasicRetryPolicyTest, LimitedRetriesKeepTheirFixedInterval) {
    answer(500);
    Task task = submitFailing(2000, 4);
    for (int retry = 0; retry < 4; ++retry) {
        expectNextAttemptAfter(task, 2000);
    }
    EXPECT_EQ((std::vector<int>{500}), task->finishCodes);
}

TEST_F(NetworkTaskBasicRetryPolicyTest, RetryAfterInSecondsOrAsADateIsWaitedWithinTheIntervalAndItsCap) {
    answer(503, "30");
    Task task = submitFailing(1000, -1);
    expectNextAttemptAfter(task, 30000);

    // The next attempt, 30 s from now, is told to come back 45 s after it.
    answer(503, httpDate(kdTime(nullptr) + 30 + 45));
    expectNextAttemptAfter(task, 30000);
    expectNextAttemptAfter(task, 45000);

    // That attempt came when the date was due: no wait is asked, the interval is kept.
    answer(503, "86400");
    expectNextAttemptAfter(task, 1000);
    expectNextAttemptAfter(task, NetworkTaskBasicRetryPolicy::MAX_RETRY_AFTER_MS);

    // Never sooner than the interval, whatever the server says.
    answer(503, "0");
    expectNextAttemptAfter(task, NetworkTaskBasicRetryPolicy::MAX_RETRY_AFTER_MS);
    expectNextAttemptAfter(task, 1000);
    manager->cancel(task);
}

TEST_F(NetworkTaskBasicRetryPolicyTest, ALimitedPolicyHonoursRetryAfterAndA429RetriesOnlyWhenToldWhen) {
    answer(429, "20");
    Task told = submitFailing(1000, 5);
    untilWaiting(told);
    answer(429);
    advanceMs(19999);
    EXPECT_EQ(1, told->attempts);
    advanceMs(1);
    pumpUntil([&] { return told->finished(); });
    EXPECT_EQ((std::vector<int>{429}), told->finishCodes);
    EXPECT_EQ(2, told->attempts);

    // A Retry-After on another status is not read, nor one that is no number or date.
    answer(500, "30");
    Task other = submitFailing(1000, 5);
    expectNextAttemptAfter(other, 1000);
    answer(503, "soon");
    expectNextAttemptAfter(other, 1000);
    expectNextAttemptAfter(other, 1000);
    manager->cancel(other);
}

TEST_F(NetworkTaskBasicRetryPolicyTest, ReachabilityReturningRetriesAtOnceAndStartsTheWaitsAfresh) {
    answer(503);
    Task task = submitFailing(1000, -1);
    Network::RetryJitter expected(kSeed);
    long long ceiling = 1000;
    for (int retry = 0; retry < 6; ++retry) {
        expectNextAttemptAfter(task, expected.between(1000, ceiling));
        ceiling *= 2;
    }
    // The network goes while the next attempt is on its way to the server.
    advanceMs(expected.between(1000, ceiling) - 1);
    task->onResponse = [] { pal::setReachability(0); };
    advanceMs(1);
    untilWaiting(task);
    task->onResponse = nullptr;
    const int attempts = task->attempts;
    advanceMs(NetworkTaskBasicRetryPolicy::MAX_BACKOFF_INTERVAL_MS * 5);
    EXPECT_EQ(attempts, task->attempts);

    pal::setReachability(1);
    pump();
    EXPECT_EQ(attempts + 1, task->attempts);
    expectNextAttemptAfter(task, 1000);
    manager->cancel(task);
}
