#pragma once

#include <boost/shared_ptr.hpp>
#include <boost/weak_ptr.hpp>
#include <vector>

#include "lifecycle/PauseResumeListener.h"
#include "lifecycle/PauseResumeListenerWrapper.h"
#include "network/NetworkTaskHolder.h"
#include "startup/StartupListener.h"
#include "util/Singleton.h"

class TiXmlDocument;

namespace Startup {

class DefaultStartupListener;
class TelephonyStartupListener;
class WifiStartupListener;

// Runs the startup cycle: asks every listener for parameters, requests the
// startup document with them and hands the answer to every listener. A cycle
// starts when the controller is made while the application runs, on every
// resume, and once more right after an answer when the request went out
// without a client identifier. Set the "startup" (or "default") host before
// the first use. A singleton; main thread only.
class StartupController : public Util::Singleton<StartupController>, public Lifecycle::PauseResumeListener {
public:
    ~StartupController() override;

    // Cancels a running request and collection and starts a new cycle.
    void fetchStartup();
    // Replaces the application's parameters, sent from the next request on;
    // they win over the listeners' values of the same name.
    void updateClientStartupParams(const StartupParams& params);

    // Listeners are held weakly and told in order of registration.
    void addListener(const boost::weak_ptr<StartupListener>& listener);
    void removeListener(const StartupListener* listener);

    bool onResumed() override;

    void onStartupParamsCollected(const StartupParams& params);
    void onStartupReady(TiXmlDocument* document);

private:
    friend class Util::Singleton<StartupController>;
    StartupController();

    void populateDefaultStartupListeners();
    void startCycle();
    // The live listeners, in order; expired entries are dropped on the way.
    std::vector<boost::shared_ptr<StartupListener> > liveListeners();

    std::vector<boost::weak_ptr<StartupListener> > listeners;
    bool needSecondStartup;
    // A second request already went out in this cycle; an answer that again
    // lacks the identifier does not start a third.
    bool secondStartupSent;
    Network::NetworkTaskHolder requestHolder;
    StartupParams clientStartupParams;
    StartupParams startupParams;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> pauseResumeListenerWrapper;
    int pendingCollectRequests;
    boost::shared_ptr<DefaultStartupListener> defaultListener;
    boost::shared_ptr<TelephonyStartupListener> telephonyListener;
    boost::shared_ptr<WifiStartupListener> wifiListener;
};

}  // namespace Startup
