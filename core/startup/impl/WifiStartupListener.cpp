#include "startup/impl/WifiStartupListener.h"

#include <KD/kd.h>

#include <boost/make_shared.hpp>
#include <cctype>
#include <locale>
#include <sstream>

#include "util/Logger.h"
#include "wireless/WifiScanRequest.h"
#include "wireless/WifiScanResult.h"

namespace Startup {

namespace {

const size_t KAssumedBssIdLength = 12;

bool isPlainBssid(const std::string& bssid) {
    if (bssid.size() != KAssumedBssIdLength) {
        return false;
    }
    for (char c : bssid) {
        if (!isxdigit(static_cast<unsigned char>(c))) {
            return false;
        }
    }
    return true;
}

// 001122aabbcc becomes 00:11:22:aa:bb:cc.
void writeBssid(std::ostringstream& out, const std::string& bssid) {
    for (size_t i = 0; i < bssid.size(); ++i) {
        if (i > 0 && i % 2 == 0) {
            out << ':';
        }
        out << bssid[i];
    }
}

}  // namespace

WifiStartupListener::WifiStartupListener() {}

WifiStartupListener::~WifiStartupListener() {
    cancelCollectStartupParams();
}

void WifiStartupListener::collectStartupParams(CollectCallback newDone) {
    KD_ASSERT(!request);
    done = newDone;
    request = boost::make_shared<Wireless::WifiScanRequest>();
    request->start(
        Wireless::WifiScanRequest::Callback::make<WifiStartupListener,
                                                  &WifiStartupListener::onWifiScanCompleted>(this));
}

void WifiStartupListener::cancelCollectStartupParams() {
    if (request) {
        request->cancel();
        request.reset();
    }
}

void WifiStartupListener::onWifiScanCompleted(
    const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results) {
    StartupParams params;
    const std::string wifi = encode(results);
    if (!wifi.empty()) {
        params["wifi"] = wifi;
    }
    done(params);
}

std::string WifiStartupListener::encode(
    const std::vector<boost::shared_ptr<Wireless::WifiScanResult> >& results) {
    std::ostringstream out;
    // No digit grouping from a global locale the application may have set.
    out.imbue(std::locale::classic());
    bool first = true;
    for (const boost::shared_ptr<Wireless::WifiScanResult>& result : results) {
        if (!result || !isPlainBssid(result->getBssid())) {
            Logger::log(Logger::Warning,
                        "WifiStartupListener: BSSID [%s] is not 12 hexadecimal digits; left out",
                        result ? result->getBssid().c_str() : "");
            continue;
        }
        if (!first) {
            out << ';';
        }
        first = false;
        writeBssid(out, result->getBssid());
        out << ',' << result->getSignalStrength();
    }
    return out.str();
}

}  // namespace Startup
