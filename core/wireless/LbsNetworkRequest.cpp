#include "wireless/LbsNetworkRequest.h"

#include <boost/make_shared.hpp>

#include "wireless/LbsNetworkRequestInternal.h"
#include "wireless/TelephonyNetworkInfoRequest.h"
#include "wireless/TelephonySignalStrengthRequest.h"
#include "wireless/WifiScanRequest.h"
#include "wireless/impl/LbsQuery.h"
#include "wireless/impl/LbsResponseParser.h"

namespace Wireless {

LbsNetworkRequest::LbsNetworkRequest() : pendingRequests(0) {}

LbsNetworkRequest::~LbsNetworkRequest() {
    cancel();
}

void LbsNetworkRequest::submit(Callback onDone) {
    cancel();
    onResponse = onDone;
    query.clear();
    wifiScanRequest = boost::make_shared<WifiScanRequest>();
    networkInfoRequest = boost::make_shared<TelephonyNetworkInfoRequest>();
    signalStrengthRequest = boost::make_shared<TelephonySignalStrengthRequest>();
    pendingRequests = 3;
    wifiScanRequest->start(
        WifiScanRequest::Callback::make<LbsNetworkRequest, &LbsNetworkRequest::onWifiScanCompleted>(this));
    networkInfoRequest->start(
        TelephonyNetworkInfoRequest::Callback::make<
            LbsNetworkRequest, &LbsNetworkRequest::onTelephonyNetworkInfoRequestCompleted>(this));
    signalStrengthRequest->start(
        TelephonySignalStrengthRequest::Callback::make<
            LbsNetworkRequest, &LbsNetworkRequest::onTelephonySignalStrengthRequestCompleted>(this));
}

void LbsNetworkRequest::cancel() {
    wifiScanRequest.reset();
    networkInfoRequest.reset();
    signalStrengthRequest.reset();
    pendingRequests = 0;
    if (internalRequest) {
        internalRequest->cancel();
        internalRequest.reset();
    }
}

void LbsNetworkRequest::onWifiScanCompleted(const std::vector<boost::shared_ptr<WifiScanResult> >& results) {
    LbsQuery::appendWifi(query, results);
    onRadioRequestCompleted();
}

void LbsNetworkRequest::onTelephonyNetworkInfoRequestCompleted(boost::shared_ptr<TelephonyNetworkInfo> info) {
    if (info) {
        LbsQuery::appendCell(query, *info);
    }
    onRadioRequestCompleted();
}

void LbsNetworkRequest::onTelephonySignalStrengthRequestCompleted(bool success, int strength) {
    LbsQuery::appendSignalStrength(query, success, strength);
    onRadioRequestCompleted();
}

void LbsNetworkRequest::onRadioRequestCompleted() {
    --pendingRequests;
    submitIfNeed();
}

void LbsNetworkRequest::submitIfNeed() {
    if (pendingRequests != 0) {
        return;
    }
    // Drops the answered radio requests; one of them is calling us and
    // touches nothing of itself afterwards.
    cancel();
    internalRequest = boost::make_shared<LbsNetworkRequestInternal>(this);
    internalRequest->submit();
}

void LbsNetworkRequest::onLbsNetworkRequestCompeted(const std::vector<unsigned char>& body, int code,
                                                    bool errorBodyAnnounced) {
    cancel();
    const Response response = LbsResponseParser::parse(body, code, errorBodyAnnounced);
    // The callback may destroy this object: nothing of it is touched after.
    const Callback callback = onResponse;
    callback(response);
}

}  // namespace Wireless
