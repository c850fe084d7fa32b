#pragma once

#include <KD/kdext.h>

#include "util/callback.h"

namespace Wireless {

// One platform query of the cell signal strength at a time. The answer comes
// to the thread that called start(), which must pump platform events; start,
// cancel and destroy it there. A query the platform refuses is answered as a
// failed one.
class TelephonySignalStrengthRequest {
public:
    // (success, strength); the strength means nothing without success.
    typedef callback<void (*)(bool, int)> Callback;

    TelephonySignalStrengthRequest();
    ~TelephonySignalStrengthRequest();

    // Restarts the query if one runs; callback hears of it once, unless
    // cancel() comes first. The callback may destroy this object.
    void start(Callback onDone);
    // Silent afterwards; the callback is kept.
    void cancel();

    static void onTelephonySignalStrengthRecievedWrapper(const KDEvent* event);

private:
    TelephonySignalStrengthRequest(const TelephonySignalStrengthRequest&) = delete;
    TelephonySignalStrengthRequest& operator=(const TelephonySignalStrengthRequest&) = delete;

    void onTelephonySignalStrengthRecieved(bool success, int strength);

    KDint handle;
    Callback onCompleted;
};

}  // namespace Wireless
