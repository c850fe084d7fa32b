#pragma once

#include <boost/unordered_map.hpp>
#include <string>

#include "util/callback.h"

class TiXmlDocument;

namespace Startup {

typedef boost::unordered_map<std::string, std::string> StartupParams;

// Contributes query parameters to the startup request and hears the answer.
// After collectStartupParams(done) the listener calls done exactly once, at
// once or later, unless cancelCollectStartupParams() comes first; after a
// cancel it never calls the old done. Main thread only.
class StartupListener {
public:
    typedef callback<void (*)(const StartupParams&)> CollectCallback;

    virtual ~StartupListener() {}

    // Reports an empty map at once.
    virtual void collectStartupParams(CollectCallback done);
    virtual void cancelCollectStartupParams() {}
    virtual void parseStartup(const TiXmlDocument& document) { (void)document; }
    // A complete startup answer has been handed to every listener.
    virtual void onStartupReady() {}
};

}  // namespace Startup
