#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <functional>
#include <string>
#include <vector>

#include "InvariantReport.h"
#include "network/NetworkTask.h"

// A client's HTTP task that checks what the network manager tells it: at most
// one final callback per submission (an offline finish is not final, the
// manager queues the task again), nothing after it, and nothing at all once
// its owner cancelled it. It may also act on its owner from inside its own
// callbacks, as applications do. Main thread only.
class ChaosTask : public Network::NetworkTask, public boost::enable_shared_from_this<ChaosTask> {
public:
    // What the task does to itself from inside a callback, through its owner.
    enum Reentry {
        NoReentry,
        CancelOnResponse,  // the owner cancels it when the head arrives
        CancelOnBytes,     // ... when body bytes arrive
        ReleaseOnFinish,   // the owner cancels and drops it in onFinished
        SubmitOnFinish,    // the owner submits another task in onFinished
        CancelOnRetry,     // the owner cancels it when an attempt is retried
        ReentryCount
    };
    enum Callback { ResponseCallback, BytesCallback, FinishCallback, RetryCallback };
    // Called by the task from inside the named callback when its re-entry is due.
    typedef std::function<void(ChaosTask& task, Reentry reentry)> OwnerHook;

    struct Settings {
        int priority = 1;
        // Read at each attempt, as applications build a URL from the host known at that time.
        boost::shared_ptr<const std::string> url;
        bool byParts = false;
        bool ready = true;
        Reentry reentry = NoReentry;
    };

    ChaosTask(const Settings& settings, OwnerHook ownerHook, InvariantReport& report);
    ~ChaosTask() override;

    // Tasks constructed and not yet destroyed, across all owners.
    static int liveCount() { return live; }

    // Called at the final callback before anything else, as a task run by a
    // NetworkTaskHolder tells its holder.
    void setFinalHook(std::function<void()> hook) { finalHook = hook; }
    // From now on the manager must not call this task any more.
    void markCancelled() { cancelled = true; }
    void setReady(bool value) { ready = value; }
    bool isCancelled() const { return cancelled; }
    bool hasFinished() const { return finals > 0; }
    std::size_t bufferedBytes() const { return body.size(); }

    bool isReadyToPerform() const override { return ready; }
    int getPriority() const override { return settings.priority; }
    boost::shared_ptr<Network::HttpRequest> issueRequest() const override;
    bool recieveResponseBodyByParts() const override { return settings.byParts; }
    void onResponseRecieved(boost::shared_ptr<Network::HttpResponse> response) override;
    void onBytesReceived(const std::vector<unsigned char>& bytes) override;
    void onFinished(int code) override;
    void onRetried() override;

private:
    // False (and a breach) when the manager may not call now.
    bool admit(const char* callback);
    void reenterIf(Reentry due);

    static int live;

    Settings settings;
    OwnerHook ownerHook;
    std::function<void()> finalHook;
    InvariantReport& report;
    bool ready;
    bool cancelled;
    int finals;
    std::vector<unsigned char> body;
};
