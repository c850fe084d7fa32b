#include "statistics/wifipool/NetworkCollectorWrapper.h"

#include <tinyxml.h>

#include "startup/StartupData.h"
#include "util/Logger.h"
#include "util/XmlUtils.h"

namespace Statistics {

namespace {

const int kDefaultScanTimeout = 30;
const int kDefaultSendTimeout = 120;

// The named first child element, or null after logging its absence.
const TiXmlElement* child(const TiXmlNode* parent, const char* name) {
    const TiXmlElement* element = parent != nullptr ? parent->FirstChildElement(name) : nullptr;
    if (element == nullptr) {
        Logger::log(Logger::Debug, "NetworkCollectorWrapper::parseStartup()[startup does not contain %s tag]",
                    name);
    }
    return element;
}

}  // namespace

NetworkCollectorWrapper::NetworkCollectorWrapper() : scanTimeout(0), sendTimeout(0) {}

void NetworkCollectorWrapper::doParseStartup(const TiXmlDocument& document) {
    Logger::log(Logger::Debug, "NetworkCollectorWrapper::doParseStartup()");
    const TiXmlElement* startup = child(&document, "startup");
    const TiXmlElement* features = startup != nullptr ? child(startup, "features") : nullptr;
    const TiXmlElement* scanner = features != nullptr ? child(features, "network_scanner") : nullptr;
    if (scanner == nullptr) {
        return;
    }
    if (Util::XmlUtils::getIntAttr(scanner, "enabled", 0) == 0) {
        // The switch stays as an earlier answer left it.
        Logger::log(Logger::Debug, "NetworkCollectorWrapper::parseStartup()[disabled]");
        return;
    }
    scanTimeout = Util::XmlUtils::getIntAttr(scanner, "scan_timeout", kDefaultScanTimeout);
    sendTimeout = Util::XmlUtils::getIntAttr(scanner, "send_timeout", kDefaultSendTimeout);
    enableFromStartup(true);
}

void NetworkCollectorWrapper::doOnStartupReadyAndEnabled() {
    Logger::log(Logger::Debug, "NetworkCollectorWrapper::doOnStartupReadyAndEnabled()");
    collector.stop();
    setParamsFromStartup();
    collector.start();
}

void NetworkCollectorWrapper::setParamsFromStartup() {
    Startup::StartupData* data = Startup::StartupData::getInstance();
    collector.setUuid(data->uuid.c_str());
    collector.setBaseUrl(data->getHost(Startup::StartupData::HOST_DEFAULT).c_str());
    collector.setLang(data->lang.c_str());
    collector.setScanTimeout(scanTimeout);
    collector.setSendTimeout(sendTimeout);
}

void NetworkCollectorWrapper::doOnStopByUser() {
    collector.stop();
}

void NetworkCollectorWrapper::init() {
    Startup::StartupFeature::init();
}

void NetworkCollectorWrapper::shutdown() {
    Startup::StartupFeature::shutdown();
    collector.stop();
}

bool NetworkCollectorWrapper::onPaused() {
    Logger::log(Logger::Debug, "NetworkCollectorWrapper::onPaused()");
    collector.onPaused();
    return true;
}

bool NetworkCollectorWrapper::onResumed() {
    Logger::log(Logger::Debug, "NetworkCollectorWrapper::onResumed()");
    collector.onResumed();
    return true;
}

}  // namespace Statistics
