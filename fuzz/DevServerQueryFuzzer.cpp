// Positioning queries and config files as the development server reads them.
// The first byte picks: even, the rest is a query string ("a=b&c=d", values
// as the HTTP layer decoded them) for the radio table; odd, the rest is a
// config file. Whatever the bytes, a position found lies on the globe with a
// positive accuracy, and a config read has only valid radios.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <sstream>
#include <string>

#include "devserver/Config.h"
#include "devserver/Locator.h"

namespace {

void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "mapcore fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

void locate(const std::string& query) {
    std::map<std::string, std::string> params;
    std::istringstream in(query);
    std::string pair;
    while (std::getline(in, pair, '&')) {
        const std::size_t equals = pair.find('=');
        params.emplace(pair.substr(0, equals), equals == std::string::npos ? "" : pair.substr(equals + 1));
    }
    static const DevServer::Locator locator(DevServer::Config::defaults());
    DevServer::PositioningRecord record;
    std::string error;
    if (locator.locate(params, record, error) && record.found) {
        check(std::fabs(record.latitude) <= 90 && std::fabs(record.longitude) <= 180,
              "a position on the globe");
        check(std::isfinite(record.accuracy) && record.accuracy > 0, "a positive accuracy");
    }
}

void readConfig(const std::string& text) {
    DevServer::Config config = DevServer::Config::defaults();
    std::string error;
    if (!DevServer::Config::parse(text, "fuzz.conf", config, error)) {
        check(error.compare(0, 10, "fuzz.conf:") == 0, "an error names the file and line");
        return;
    }
    for (const DevServer::AccessPoint& point : config.accessPoints) {
        check(point.bssid.size() == 12 && point.range > 0 && std::fabs(point.latitude) <= 90,
              "a valid access point");
    }
    check(config.scanTimeout > 0 && config.sendTimeout > 0, "positive periods");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) {
        return 0;
    }
    const std::string text(reinterpret_cast<const char*>(data) + 1, size - 1);
    if (data[0] % 2 == 0) {
        locate(text);
    } else {
        readConfig(text);
    }
    return 0;
}
