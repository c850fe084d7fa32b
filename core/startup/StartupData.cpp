#include "startup/StartupData.h"

#include <KD/kdext.h>

namespace Startup {

char const* const StartupData::HOST_DEFAULT = "default";
char const* const StartupData::HOST_STARTUP = "startup";
char const* const StartupData::HOST_TILES = "tiles";
char const* const StartupData::HOST_SEARCH = "search";
char const* const StartupData::HOST_GEOCODE = "geocode";
char const* const StartupData::HOST_TRAFFIC_GET = "trafficget";
char const* const StartupData::HOST_TRAFFIC_COLLECT = "trafficcollect";
char const* const StartupData::HOST_CELLID = "cellid";
char const* const StartupData::HOST_USERPOI_CATS = "userpoicats";
char const* const StartupData::HOST_USERPOI_GET = "userpoiget";
char const* const StartupData::HOST_ROUTER = "router";
char const* const StartupData::HOST_AGREEMENT = "agreement";
char const* const StartupData::HOST_FEEDBACK = "feedback";
char const* const StartupData::HOST_VOICE = "voice";
char const* const StartupData::HOST_STREETVIEW = "streetview";
char const* const StartupData::HOST_VEDO = "vedo";
char const* const StartupData::HOST_MAP_RESOURCES = "mapresources";

namespace {

const char* orEmpty(const char* text) {
    return text != nullptr ? text : "";
}

}  // namespace

StartupData::StartupData() : startupPath("startup"), startupReady(false) {
    cacheLang();
}

const std::string& StartupData::getHost(const std::string& type) const {
    boost::unordered_map<std::string, std::string>::const_iterator it = hosts.find(type);
    if (it == hosts.end()) {
        it = hosts.find(HOST_DEFAULT);
    }
    KD_ASSERT(it != hosts.end());
    if (it == hosts.end()) {
        static const std::string kNoHost;
        return kNoHost;
    }
    return it->second;
}

void StartupData::setHost(const std::string& type, const std::string& host) {
    std::string& stored = hosts[type];
    stored = host;
    if (!stored.empty() && stored[stored.size() - 1] != '/') {
        stored += '/';
    }
}

void StartupData::cacheLang() {
    char buffer[256];
    kdSprintf_s(buffer, sizeof(buffer), "%s-%s", orEmpty(kdLocaleGetLangZVR()),
                orEmpty(kdLocaleGetRegionZVR()));
    lang = buffer;
}

}  // namespace Startup
