#pragma once

#include <boost/shared_ptr.hpp>

#include "startup/StartupListener.h"

namespace Wireless {
class TelephonyNetworkInfo;
class TelephonyNetworkInfoRequest;
}  // namespace Wireless

namespace Startup {

// Tells the startup server the serving cell: "operatorid", "countrycode",
// "cellid" and "lac", or nothing when the platform knows no cell. Main
// thread only.
class TelephonyStartupListener : public StartupListener {
public:
    TelephonyStartupListener();
    ~TelephonyStartupListener() override;

    void collectStartupParams(CollectCallback done) override;
    void cancelCollectStartupParams() override;

    void onNetworkInfoRecieved(boost::shared_ptr<Wireless::TelephonyNetworkInfo> info);

private:
    boost::shared_ptr<Wireless::TelephonyNetworkInfoRequest> request;
    CollectCallback done;
};

}  // namespace Startup
