#include "wireless/TelephonyNetworkInfoRequest.h"

#include <boost/make_shared.hpp>
#include <string>

#include "wireless/impl/RadioEvents.h"

namespace Wireless {

namespace {

// The platform's fixed-size text field, also when it lacks its terminator.
template <size_t N>
std::string boundedText(const KDchar (&field)[N]) {
    return std::string(field, kdStrnlen(field, N));
}

}  // namespace

TelephonyNetworkInfoRequest::TelephonyNetworkInfoRequest() : handle(0) {}

TelephonyNetworkInfoRequest::~TelephonyNetworkInfoRequest() {
    cancel();
}

void TelephonyNetworkInfoRequest::start(Callback onDone) {
    cancel();
    onCompleted = onDone;
    kdInstallCallback(&TelephonyNetworkInfoRequest::onNetworkInfoRecievedWrapper,
                      KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR, this);
    handle = kdRequestTelephonyNetworkInfoZVR(this);
    if (handle == 0) {
        postAnswerWithoutData(KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR, this);
    }
}

void TelephonyNetworkInfoRequest::cancel() {
    kdInstallCallback(nullptr, KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR, this);
    if (handle != 0) {
        kdCancelTelephonyNetworkInfoZVR(handle);
        handle = 0;
    }
}

void TelephonyNetworkInfoRequest::onNetworkInfoRecievedWrapper(const KDEvent* event) {
    static_cast<TelephonyNetworkInfoRequest*>(event->userptr)
        ->onNetworkInfoRecieved(static_cast<const KDTelephonyNetworkInfoZVR*>(event->data.recordzvr.record));
    releaseRecord(event);
}

void TelephonyNetworkInfoRequest::onNetworkInfoRecieved(const KDTelephonyNetworkInfoZVR* info) {
    cancel();
    boost::shared_ptr<TelephonyNetworkInfo> result;
    if (info != nullptr && info->isKnown != 0) {
        result = boost::make_shared<TelephonyNetworkInfo>(info->cellId, info->locationAreaCode,
                                                          boundedText(info->operatorCode),
                                                          boundedText(info->countryCode));
    } else {
        result = boost::make_shared<TelephonyNetworkInfo>();
    }
    // The callback may destroy this object: nothing of it is touched after.
    const Callback callback = onCompleted;
    callback(result);
}

}  // namespace Wireless
