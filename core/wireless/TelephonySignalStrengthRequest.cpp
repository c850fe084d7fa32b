#include "wireless/TelephonySignalStrengthRequest.h"

#include "wireless/impl/RadioEvents.h"

namespace Wireless {

TelephonySignalStrengthRequest::TelephonySignalStrengthRequest() : handle(0) {}

TelephonySignalStrengthRequest::~TelephonySignalStrengthRequest() {
    cancel();
}

void TelephonySignalStrengthRequest::start(Callback onDone) {
    cancel();
    onCompleted = onDone;
    kdInstallCallback(&TelephonySignalStrengthRequest::onTelephonySignalStrengthRecievedWrapper,
                      KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR, this);
    handle = kdRequestTelephonySignalStrengthInfoZVR(this);
    if (handle == 0) {
        postAnswerWithoutData(KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR, this);
    }
}

void TelephonySignalStrengthRequest::cancel() {
    kdInstallCallback(nullptr, KD_EVENT_TELEPHONY_SIGNAL_STRENGTH_ZVR, this);
    if (handle != 0) {
        kdCancelTelephonySignalStrengthInfoRequestZVR(handle);
        handle = 0;
    }
}

void TelephonySignalStrengthRequest::onTelephonySignalStrengthRecievedWrapper(const KDEvent* event) {
    static_cast<TelephonySignalStrengthRequest*>(event->userptr)
        ->onTelephonySignalStrengthRecieved(event->data.words[0] != 0,
                                            static_cast<int>(event->data.words[1]));
}

void TelephonySignalStrengthRequest::onTelephonySignalStrengthRecieved(bool success, int strength) {
    cancel();
    // The callback may destroy this object: nothing of it is touched after.
    const Callback callback = onCompleted;
    callback(success, strength);
}

}  // namespace Wireless
