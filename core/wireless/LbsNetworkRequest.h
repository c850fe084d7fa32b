#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "util/callback.h"
#include "wireless/TelephonyNetworkInfo.h"
#include "wireless/WifiScanResult.h"

namespace Wireless {

class LbsNetworkRequestInternal;
class TelephonyNetworkInfoRequest;
class TelephonySignalStrengthRequest;
class WifiScanRequest;

// A position estimate from the positioning server ("cellid" host) out of the
// Wi-Fi access points, the serving cell and the signal strength the radios
// report. Each submission that is not cancelled ends in exactly one callback.
// Runs on the network manager's thread: submit, cancel and destroy it there.
class LbsNetworkRequest {
public:
    struct Response {
        // 0: a position with an accuracy. 1: no usable answer (also with
        // coordinates but without any accuracy). Otherwise the HTTP status of
        // an answer with a body that was not 200, a negative transport failure
        // code with a body, the parser's error number for a body that is not
        // well-formed XML, or the server's error code.
        int error = 1;
        float latitude = 0;   // degrees
        float longitude = 0;  // degrees
        float accuracy = 0;   // metres
    };
    typedef callback<void (*)(const Response&)> Callback;

    LbsNetworkRequest();
    ~LbsNetworkRequest();

    // Starts a new request, silently cancelling one that runs. The callback
    // may destroy this object.
    void submit(Callback onDone);
    // Nothing is reported afterwards.
    void cancel();

    // Query parameters gathered for the running submission.
    const std::string& getQuery() const { return query; }

    // From the HTTP task: the answer's body (2xx answers only), the finish
    // code, and whether an answer outside 2xx came with a body.
    void onLbsNetworkRequestCompeted(const std::vector<unsigned char>& body, int code,
                                     bool errorBodyAnnounced);

private:
    LbsNetworkRequest(const LbsNetworkRequest&) = delete;
    LbsNetworkRequest& operator=(const LbsNetworkRequest&) = delete;

    void onWifiScanCompleted(const std::vector<boost::shared_ptr<WifiScanResult> >& results);
    void onTelephonyNetworkInfoRequestCompleted(boost::shared_ptr<TelephonyNetworkInfo> info);
    void onTelephonySignalStrengthRequestCompleted(bool success, int strength);
    void onRadioRequestCompleted();
    void submitIfNeed();

    Callback onResponse;
    std::string query;
    int pendingRequests;
    boost::shared_ptr<WifiScanRequest> wifiScanRequest;
    boost::shared_ptr<TelephonyNetworkInfoRequest> networkInfoRequest;
    boost::shared_ptr<TelephonySignalStrengthRequest> signalStrengthRequest;
    boost::shared_ptr<LbsNetworkRequestInternal> internalRequest;
};

}  // namespace Wireless
