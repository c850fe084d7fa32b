#include "startup/impl/TelephonyStartupListener.h"

#include <KD/kd.h>

#include <boost/make_shared.hpp>
#include <cstdio>

#include "wireless/TelephonyNetworkInfo.h"
#include "wireless/TelephonyNetworkInfoRequest.h"

namespace Startup {

namespace {

std::string unsignedText(int value) {
    char buffer[16];
    snprintf(buffer, sizeof(buffer), "%u", static_cast<unsigned int>(value));
    return buffer;
}

}  // namespace

TelephonyStartupListener::TelephonyStartupListener() {}

TelephonyStartupListener::~TelephonyStartupListener() {
    cancelCollectStartupParams();
}

void TelephonyStartupListener::collectStartupParams(CollectCallback newDone) {
    KD_ASSERT(!request);
    done = newDone;
    request = boost::make_shared<Wireless::TelephonyNetworkInfoRequest>();
    request->start(Wireless::TelephonyNetworkInfoRequest::Callback::make<
                   TelephonyStartupListener, &TelephonyStartupListener::onNetworkInfoRecieved>(this));
}

void TelephonyStartupListener::cancelCollectStartupParams() {
    if (request) {
        request->cancel();
        request.reset();
    }
}

void TelephonyStartupListener::onNetworkInfoRecieved(boost::shared_ptr<Wireless::TelephonyNetworkInfo> info) {
    StartupParams params;
    if (info && info->isValid()) {
        params["operatorid"] = info->getOperatorId();
        params["countrycode"] = info->getCountryCode();
        params["cellid"] = unsignedText(info->getCellID());
        params["lac"] = unsignedText(info->getLocationAreaCode());
    }
    done(params);
}

}  // namespace Startup
