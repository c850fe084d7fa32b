// Simulated device data: the strings of kdGetStringZVR, the device id, the
// screen density and the locale; and resetSimulation(), which restores every
// simulated service.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <algorithm>
#include <array>
#include <mutex>
#include <string>
#include <unordered_set>

#include "SimInternal.h"

namespace {

const std::array<const char*, 7> kDefaultStrings = {
    "android", "Simulated Device", "mapcore", "13", "mapcore", "1.0", "1",
};
const char* const kDefaultLanguage = "en";
const char* const kDefaultRegion = "US";
const KDint kDefaultDpi = 160;

// Returned C strings must stay valid after the value changes, because callers
// keep the pointer. Every value ever set is therefore kept in this pool, whose
// nodes never move; it grows only by the distinct values a test or demo sets.
class StringPool {
public:
    const char* intern(const std::string& value) { return pool_.insert(value).first->c_str(); }

private:
    std::unordered_set<std::string> pool_;
};

struct DeviceState {
    std::array<const char*, 7> strings = kDefaultStrings;
    std::string deviceId;
    bool deviceIdSupported = true;
    std::string deviceIdSetByLibrary;
    KDint dpi = kDefaultDpi;
    const char* language = kDefaultLanguage;
    const char* region = kDefaultRegion;
};

std::mutex gMutex;
StringPool gPool;
DeviceState gState;

bool isStringId(KDint id) {
    return id >= 0 && id < static_cast<KDint>(kDefaultStrings.size());
}

}  // namespace

extern "C" {

const KDchar* kdGetStringZVR(KDint id) {
    std::lock_guard<std::mutex> lock(gMutex);
    return isStringId(id) ? gState.strings[id] : "";
}

KDint kdIsDeviceIdSupportedZVR(void) {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.deviceIdSupported ? 1 : 0;
}

KDint kdGetDeviceIdZVR(KDchar* buffer, KDsize size) {
    if (buffer == nullptr || size == 0) {
        return 0;
    }
    std::lock_guard<std::mutex> lock(gMutex);
    const std::string& id = gState.deviceId;
    if (!gState.deviceIdSupported || id.empty()) {
        buffer[0] = '\0';
        return 0;
    }
    const std::size_t length = std::min(id.size(), size - 1);
    id.copy(buffer, length);
    buffer[length] = '\0';
    return 1;
}

void kdSetDeviceIdZVR(const KDchar* id) {
    std::lock_guard<std::mutex> lock(gMutex);
    const std::string value = id != nullptr ? id : "";
    gState.deviceIdSetByLibrary = value;
    // A real device keeps the id it was given, so later requests report it.
    gState.deviceId = value;
}

KDint kdDotsPerInchZVR(void) {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.dpi;
}

const KDchar* kdLocaleGetLangZVR(void) {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.language;
}

const KDchar* kdLocaleGetRegionZVR(void) {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.region;
}

}  // extern "C"

namespace pal {

void setDeviceString(KDint id, const std::string& value) {
    std::lock_guard<std::mutex> lock(gMutex);
    if (isStringId(id)) {
        gState.strings[id] = gPool.intern(value);
    }
}

void setDeviceId(const std::string& id, bool supported) {
    std::lock_guard<std::mutex> lock(gMutex);
    gState.deviceId = id;
    gState.deviceIdSupported = supported;
}

std::string deviceIdSetByLibrary() {
    std::lock_guard<std::mutex> lock(gMutex);
    return gState.deviceIdSetByLibrary;
}

void setDotsPerInch(KDint dpi) {
    std::lock_guard<std::mutex> lock(gMutex);
    gState.dpi = dpi;
}

void setLocale(const std::string& language, const std::string& region) {
    std::lock_guard<std::mutex> lock(gMutex);
    gState.language = gPool.intern(language);
    gState.region = gPool.intern(region);
}

void resetSimulation() {
    {
        std::lock_guard<std::mutex> lock(gMutex);
        gState = DeviceState();
    }
    detail::resetRequests();
    detail::resetRadios();
    detail::resetSensors();
    detail::resetAudio();
    detail::resetGraphics();
    detail::resetThreads();
}

namespace detail {

void releaseUndeliveredPayload(const KDEvent& event) {
    switch (event.type) {
        case KD_EVENT_TELEPHONY_NETWORK_INFO_ZVR:
        case KD_EVENT_WIFI_SCAN_ZVR:
            if (event.data.recordzvr.release != nullptr) {
                event.data.recordzvr.release(&event);
            }
            break;
        case KD_EVENT_LOCATION_ZVR:
            kdFree(event.data.p[0]);
            break;
        case KD_EVENT_ACCELEROMETER_ZVR:
            kdAccelerationDismissDataZVR(static_cast<KDAccelerationZVR*>(event.data.p[0]));
            break;
        default:
            break;
    }
}

}  // namespace detail
}  // namespace pal
