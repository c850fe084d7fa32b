#pragma once

#include <boost/unordered_map.hpp>
#include <string>

#include "util/Singleton.h"

namespace Startup {

// What the startup answer tells the rest of the system: the client identifier,
// the language tag, the server host of each kind of request and whether a
// complete answer has arrived. Components ask for their host each time they
// build a URL, so a host received later takes effect at once. Nothing is
// persisted. Main thread only; nothing is locked.
class StartupData : public Util::Singleton<StartupData> {
public:
    static char const* const HOST_DEFAULT;
    static char const* const HOST_STARTUP;
    static char const* const HOST_TILES;
    static char const* const HOST_SEARCH;
    static char const* const HOST_GEOCODE;
    static char const* const HOST_TRAFFIC_GET;
    static char const* const HOST_TRAFFIC_COLLECT;
    static char const* const HOST_CELLID;
    static char const* const HOST_USERPOI_CATS;
    static char const* const HOST_USERPOI_GET;
    static char const* const HOST_ROUTER;
    static char const* const HOST_AGREEMENT;
    static char const* const HOST_FEEDBACK;
    static char const* const HOST_VOICE;
    static char const* const HOST_STREETVIEW;
    static char const* const HOST_VEDO;
    static char const* const HOST_MAP_RESOURCES;

    StartupData();

    // The host of type, else the "default" host. Without either it asserts and
    // returns an empty string: the application must set the "startup" or the
    // "default" host before the first startup.
    const std::string& getHost(const std::string& type) const;
    // Replaces an earlier host of type; a non-empty host gets a final "/".
    void setHost(const std::string& type, const std::string& host);
    // Recomputes lang from the platform locale.
    void cacheLang();

    // Path of the startup request below the "startup" host.
    std::string startupPath;
    std::string uuid;
    boost::unordered_map<std::string, std::string> hosts;
    // "language-region", sent with every startup request.
    std::string lang;
    // Set once a complete startup answer has been handed out; never cleared.
    bool startupReady;
    std::string voiceAsr;
    std::string voiceLogging;
};

}  // namespace Startup
