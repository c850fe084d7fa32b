#include "startup/StartupController.h"

#include <KD/kd.h>

#include <boost/make_shared.hpp>

#include "lifecycle/PauseResumeHandler.h"
#include "network/NetworkManager.h"
#include "startup/StartupData.h"
#include "startup/StartupRequest.h"
#include "startup/impl/DefaultStartupListener.h"
#include "startup/impl/TelephonyStartupListener.h"
#include "startup/impl/WifiStartupListener.h"
#include "util/Logger.h"

namespace Startup {

StartupController::StartupController()
    : needSecondStartup(true),
      secondStartupSent(false),
      clientStartupParams(11),
      startupParams(11),
      pendingCollectRequests(0) {
    // Made first so that it is torn down after the controller, whose holder
    // still cancels its request then.
    Network::NetworkManager::getInstance();
    pauseResumeListenerWrapper = boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this);
    Lifecycle::PauseResumeHandler* handler = Lifecycle::PauseResumeHandler::getInstance();
    if (handler != nullptr) {
        handler->addListener(pauseResumeListenerWrapper);
    }
    populateDefaultStartupListeners();
    if (handler != nullptr && !handler->getIsAppPaused()) {
        fetchStartup();
    }
}

StartupController::~StartupController() {
    if (requestHolder.isWorking()) {
        requestHolder.cancel();
    }
    for (const boost::shared_ptr<StartupListener>& listener : liveListeners()) {
        listener->cancelCollectStartupParams();
    }
}

void StartupController::populateDefaultStartupListeners() {
    pendingCollectRequests = 0;
    defaultListener = boost::make_shared<DefaultStartupListener>(StartupData::getInstance());
    telephonyListener = boost::make_shared<TelephonyStartupListener>();
    wifiListener = boost::make_shared<WifiStartupListener>();
    listeners.push_back(defaultListener);
    listeners.push_back(telephonyListener);
    listeners.push_back(wifiListener);
}

bool StartupController::onResumed() {
    fetchStartup();
    return true;
}

void StartupController::fetchStartup() {
    secondStartupSent = false;
    startCycle();
}

void StartupController::startCycle() {
    if (requestHolder.isWorking()) {
        requestHolder.cancel();
    }
    pendingCollectRequests = 0;
    for (const boost::shared_ptr<StartupListener>& listener : liveListeners()) {
        listener->cancelCollectStartupParams();
    }
    // One snapshot is counted and asked, so a listener that goes away in
    // between cannot leave the cycle waiting for an answer that never comes.
    const std::vector<boost::shared_ptr<StartupListener> > snapshot = liveListeners();
    pendingCollectRequests = static_cast<int>(snapshot.size());
    KD_ASSERT(pendingCollectRequests > 0);
    for (const boost::shared_ptr<StartupListener>& listener : snapshot) {
        listener->collectStartupParams(
            StartupListener::CollectCallback::make<StartupController,
                                                   &StartupController::onStartupParamsCollected>(this));
    }
}

void StartupController::onStartupParamsCollected(const StartupParams& params) {
    --pendingCollectRequests;
    for (const StartupParams::value_type& param : params) {
        startupParams[param.first] = param.second;
    }
    if (pendingCollectRequests != 0) {
        return;
    }
    needSecondStartup = StartupData::getInstance()->uuid.empty() && !secondStartupSent;
    for (const StartupParams::value_type& param : clientStartupParams) {
        startupParams[param.first] = param.second;
    }
    requestHolder.submitInfRetries(boost::make_shared<StartupRequest>(
        startupParams,
        StartupRequest::ReadyCallback::make<StartupController, &StartupController::onStartupReady>(this)));
}

void StartupController::onStartupReady(TiXmlDocument* document) {
    requestHolder.onFinished();
    for (const boost::shared_ptr<StartupListener>& listener : liveListeners()) {
        listener->parseStartup(*document);
    }
    if (needSecondStartup) {
        Logger::log(Logger::Debug, "StartupController::onStartupReady()[needSecondStartup]");
        secondStartupSent = true;
        startCycle();
        return;
    }
    if (StartupData::getInstance()->uuid.empty()) {
        Logger::log(Logger::Warning,
                    "StartupController: the startup answers carry no uuid; not asking again");
    }
    for (const boost::shared_ptr<StartupListener>& listener : liveListeners()) {
        listener->onStartupReady();
    }
}

void StartupController::updateClientStartupParams(const StartupParams& params) {
    clientStartupParams = params;
}

void StartupController::addListener(const boost::weak_ptr<StartupListener>& listener) {
    listeners.push_back(listener);
}

void StartupController::removeListener(const StartupListener* listener) {
    for (std::vector<boost::weak_ptr<StartupListener> >::iterator it = listeners.begin();
         it != listeners.end(); ++it) {
        boost::shared_ptr<StartupListener> live = it->lock();
        if (live.get() == listener) {
            listeners.erase(it);
            return;
        }
    }
}

std::vector<boost::shared_ptr<StartupListener> > StartupController::liveListeners() {
    std::vector<boost::shared_ptr<StartupListener> > live;
    std::vector<boost::weak_ptr<StartupListener> > kept;
    for (const boost::weak_ptr<StartupListener>& entry : listeners) {
        boost::shared_ptr<StartupListener> listener = entry.lock();
        if (listener) {
            live.push_back(listener);
            kept.push_back(entry);
        }
    }
    listeners.swap(kept);
    return live;
}

}  // namespace Startup
