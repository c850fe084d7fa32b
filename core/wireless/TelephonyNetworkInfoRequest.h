#pragma once

#include <KD/kdext.h>

#include <boost/shared_ptr.hpp>

#include "util/callback.h"
#include "wireless/TelephonyNetworkInfo.h"

namespace Wireless {

// One platform query of the serving cell at a time. The answer comes to the
// thread that called start(), which must pump platform events; start, cancel
// and destroy it there. A query the platform refuses is answered with an
// invalid record.
class TelephonyNetworkInfoRequest {
public:
    typedef callback<void (*)(boost::shared_ptr<TelephonyNetworkInfo>)> Callback;

    TelephonyNetworkInfoRequest();
    ~TelephonyNetworkInfoRequest();

    // Restarts the query if one runs; callback hears of it once, unless
    // cancel() comes first. The callback may destroy this object.
    void start(Callback onDone);
    // Silent afterwards; the callback is kept.
    void cancel();

    static void onNetworkInfoRecievedWrapper(const KDEvent* event);

private:
    TelephonyNetworkInfoRequest(const TelephonyNetworkInfoRequest&) = delete;
    TelephonyNetworkInfoRequest& operator=(const TelephonyNetworkInfoRequest&) = delete;

    void onNetworkInfoRecieved(const KDTelephonyNetworkInfoZVR* info);

    KDint handle;
    Callback onCompleted;
};

}  // namespace Wireless
