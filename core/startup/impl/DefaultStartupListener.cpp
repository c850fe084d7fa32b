#include "startup/impl/DefaultStartupListener.h"

#include <KD/kd.h>
#include <KD/kdext.h>
#include <tinyxml.h>

#include <cstdio>

#include "location/LocationManager.h"
#include "startup/StartupData.h"
#include "util/Logger.h"
#include "util/NumberText.h"

namespace Startup {

namespace {

const KDsize kDeviceIdBufferSize = 256;

std::string deviceString(KDint id) {
    const KDchar* value = kdGetStringZVR(id);
    return value != nullptr ? std::string(value) : std::string();
}

// "3.259" gives 325: the server compares versions as hundredths.
std::string appVersion() {
    const double version = Util::NumberText::leadingDouble(deviceString(KD_STRING_APP_VERSION_ZVR));
    const double hundredths = version * 100.0;
    // Out-of-range texts would make the conversion undefined; they say nothing anyway.
    const unsigned int value =
        hundredths >= 0.0 && hundredths < 4294967296.0 ? static_cast<unsigned int>(hundredths) : 0;
    char buffer[16];
    snprintf(buffer, sizeof(buffer), "%u", value);
    return buffer;
}

bool isHttpUrl(const std::string& text) {
    return text.compare(0, 7, "http://") == 0 || text.compare(0, 8, "https://") == 0;
}

}  // namespace

DefaultStartupListener::DefaultStartupListener(StartupData* aStartupData) : startupData(aStartupData) {
    KD_ASSERT(aStartupData);
}

void DefaultStartupListener::collectStartupParams(CollectCallback done) {
    StartupParams params;
    addDeviceParams(params);
    addLocationParam(params);
    done(params);
}

void DefaultStartupListener::addDeviceParams(StartupParams& params) const {
    if (kdIsDeviceIdSupportedZVR() != 0) {
        KDchar buffer[kDeviceIdBufferSize] = {0};
        params["deviceid"] =
            kdGetDeviceIdZVR(buffer, sizeof(buffer)) != 0 ? std::string(buffer) : std::string();
    }
    params["model"] = deviceString(KD_STRING_DEVICE_MODEL_ZVR);
    params["manufacturer"] = deviceString(KD_STRING_MANUFACTURER_ZVR);
    params["os_version"] = deviceString(KD_STRING_OS_VERSION_ZVR);
    params["app_platform"] = deviceString(KD_STRING_APP_PLATFORM_ZVR);
    params["app_version"] = appVersion();
    params["build_number"] = deviceString(KD_STRING_BUILD_NUMBER_ZVR);
    params["scalefactor"] = Util::NumberText::fixed(kdDotsPerInchZVR() / 160.0, 1);
}

void DefaultStartupListener::addLocationParam(StartupParams& params) const {
    const Location::Location& last = Location::LocationManager::getInstance()->getLastLocation();
    if (last.accuracy >= 0.0f && last.precision != Location::PrecisionNone) {
        params["ll"] =
            Util::NumberText::fixed(last.latitude, 6) + "," + Util::NumberText::fixed(last.longitude, 6);
    }
}

void DefaultStartupListener::parseStartup(const TiXmlDocument& document) {
    const TiXmlElement* root = document.FirstChildElement("startup");
    if (root == nullptr) {
        Logger::log(Logger::Warning, "DefaultStartupListener: the answer has no startup element; ignored");
        return;
    }
    const TiXmlElement* uuid = root->FirstChildElement("uuid");
    if (uuid != nullptr && uuid->GetText() != nullptr) {
        startupData->uuid = uuid->GetText();
    } else {
        Logger::log(Logger::Warning, "DefaultStartupListener: the answer has no uuid; the known one stays");
    }
    const TiXmlElement* deviceId = root->FirstChildElement("deviceid");
    if (kdIsDeviceIdSupportedZVR() != 0 && deviceId != nullptr) {
        kdSetDeviceIdZVR(deviceId->GetText() != nullptr ? deviceId->GetText() : "");
    }
    parseHosts(root);
    parseVoice(root);
}

void DefaultStartupListener::parseHosts(const TiXmlElement* root) {
    const TiXmlElement* queryHosts = root->FirstChildElement("query_hosts");
    if (queryHosts == nullptr) {
        Logger::log(Logger::Warning,
                    "DefaultStartupListener: the answer has no query_hosts; the known hosts stay");
        return;
    }
    for (const TiXmlElement* host = queryHosts->FirstChildElement("host"); host != nullptr;
         host = host->NextSiblingElement("host")) {
        const char* type = host->Attribute("type");
        const char* url = host->GetText();
        if (type == nullptr || url == nullptr || !isHttpUrl(url)) {
            Logger::log(Logger::Warning,
                        "DefaultStartupListener: host [%s] = [%s] skipped: a host needs a type and an http "
                        "or https URL",
                        type != nullptr ? type : "", url != nullptr ? url : "");
            continue;
        }
        startupData->setHost(type, url);
    }
}

void DefaultStartupListener::parseVoice(const TiXmlElement* root) {
    const TiXmlElement* features = root->FirstChildElement("features");
    const TiXmlElement* voice = features != nullptr ? features->FirstChildElement("voice") : nullptr;
    if (voice == nullptr) {
        return;
    }
    const TiXmlElement* asr = voice->FirstChildElement("asr");
    if (asr != nullptr && asr->GetText() != nullptr) {
        startupData->voiceAsr = asr->GetText();
    }
    const TiXmlElement* logging = voice->FirstChildElement("logging");
    if (logging != nullptr && logging->GetText() != nullptr) {
        startupData->voiceLogging = logging->GetText();
    }
}

void DefaultStartupListener::onStartupReady() {
    startupData->startupReady = true;
}

}  // namespace Startup
