#pragma once

#include <map>
#include <string>

#include "devserver/Config.h"
#include "devserver/Journal.h"

namespace DevServer {

// Places a device from the radios of one positioning query, with the
// config's radio table. Known Wi-Fi access points give the position when
// there are any: their mean, each weighted by its signal's amplitude
// (10^(dBm/20), which falls as 1/distance in free space), and an accuracy of
// their ranges averaged with the same weights. Otherwise a known serving cell
// gives its own position and range. Immutable; any thread.
class Locator {
public:
    // The error code answered when no radio of the query is known.
    static const int kUnknownRadios = 404;

    explicit Locator(const Config& config);

    // Fills the radios, found, the position and the error of record from the
    // query parameters (wifinetworks, cellid, lac, operatorid, countrycode,
    // signalstrength). False, with error set, when the query is malformed.
    bool locate(const std::map<std::string, std::string>& params, PositioningRecord& record,
                std::string& error) const;

private:
    bool addWifi(const std::string& list, PositioningRecord& record, std::string& error) const;
    bool addCell(const std::map<std::string, std::string>& params, PositioningRecord& record,
                 std::string& error) const;

    Config config;
};

}  // namespace DevServer
