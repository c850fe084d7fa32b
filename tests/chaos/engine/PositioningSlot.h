#pragma once

#include <memory>

#include "InvariantReport.h"
#include "wireless/LbsNetworkRequest.h"

// One network positioning request of the application: made, dropped
// (destroyed) and cancelled at any time, also from inside its own callback.
// Checks that each submission ends in at most one callback and none after it
// was cancelled or dropped. Outlives its request, so that a late callback is
// caught here rather than in freed memory. Main thread only.
class PositioningSlot {
public:
    enum Reentry { NoReentry, DropOnAnswer, SubmitAgainOnAnswer, CancelOnAnswer, ReentryCount };

    explicit PositioningSlot(InvariantReport& report) : report(report), reentry(NoReentry), waiting(false) {}

    void submit(Reentry onAnswer);
    void cancel();
    void drop();
    bool exists() const { return request != nullptr; }

private:
    PositioningSlot(const PositioningSlot&) = delete;
    PositioningSlot& operator=(const PositioningSlot&) = delete;

    void onAnswer(const Wireless::LbsNetworkRequest::Response& response);

    InvariantReport& report;
    std::unique_ptr<Wireless::LbsNetworkRequest> request;
    Reentry reentry;
    // A submission runs that has not answered and was not withdrawn.
    bool waiting;
};
