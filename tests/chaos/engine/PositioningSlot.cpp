#include "PositioningSlot.h"

void PositioningSlot::submit(Reentry onAnswer) {
    if (!request) {
        request.reset(new Wireless::LbsNetworkRequest());
    }
    reentry = onAnswer;
    waiting = true;
    request->submit(
        Wireless::LbsNetworkRequest::Callback::make<PositioningSlot, &PositioningSlot::onAnswer>(this));
}

void PositioningSlot::cancel() {
    if (request) {
        request->cancel();
    }
    waiting = false;
}

void PositioningSlot::drop() {
    request.reset();
    waiting = false;
}

void PositioningSlot::onAnswer(const Wireless::LbsNetworkRequest::Response&) {
    if (!waiting) {
        report.breach(request ? "a positioning request answered after it was cancelled or had answered"
                              : "a dropped positioning request answered");
        return;
    }
    waiting = false;
    switch (reentry) {
        case DropOnAnswer:
            // Allowed by the request: the callback may destroy it.
            request.reset();
            break;
        case SubmitAgainOnAnswer:
            reentry = NoReentry;
            waiting = true;
            request->submit(
                Wireless::LbsNetworkRequest::Callback::make<PositioningSlot, &PositioningSlot::onAnswer>(
                    this));
            break;
        case CancelOnAnswer:
            request->cancel();
            break;
        default:
            break;
    }
}
