#include "startup/StartupFeature.h"

#include "lifecycle/PauseResumeHandler.h"
#include "startup/StartupController.h"
#include "util/Logger.h"

namespace Startup {

StartupFeature::StartupFeature() : enabledByUser(false), enabledFromStartup(false) {}

StartupFeature::~StartupFeature() {}

void StartupFeature::init() {
    boost::shared_ptr<StartupFeature> self = shared_from_this();
    StartupController::getInstance()->addListener(boost::weak_ptr<StartupListener>(self));
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->addListener(boost::weak_ptr<Lifecycle::PauseResumeListener>(
            boost::shared_ptr<Lifecycle::PauseResumeListener>(self)));
    }
}

void StartupFeature::shutdown() {
    boost::shared_ptr<StartupFeature> self = shared_from_this();
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->removeListener(self.get());
    }
    StartupController::getInstance()->removeListener(self.get());
}

void StartupFeature::parseStartup(const TiXmlDocument& document) {
    Logger::log(Logger::Debug, "StartupFeature::parseStartup()");
    doParseStartup(document);
}

void StartupFeature::onStartupReady() {
    if (!enabledByUser) {
        Logger::log(Logger::Debug, "StartupFeature::onStartupReady()[!enabledByUser]");
        return;
    }
    if (!enabledFromStartup) {
        Logger::log(Logger::Debug, "StartupFeature::onStartupReady()[!enabledFromStartup]");
        return;
    }
    Logger::log(Logger::Debug, "StartupFeature::onStartupReady()[enabled]");
    doOnStartupReadyAndEnabled();
}

void StartupFeature::enableByUser(bool value) {
    Logger::log(Logger::Debug, "StartupFeature::enableByUser()[value: %d]", value ? 1 : 0);
    if (value == enabledByUser) {
        return;
    }
    enabledByUser = value;
    if (value) {
        Logger::log(Logger::Debug, "StartupFeature::enableByUser()[onStartupReady]");
        onStartupReady();
    } else {
        doOnStopByUser();
    }
}

void StartupFeature::enableFromStartup(bool value) {
    enabledFromStartup = value;
}

}  // namespace Startup
