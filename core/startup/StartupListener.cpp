#include "startup/StartupListener.h"

namespace Startup {

void StartupListener::collectStartupParams(CollectCallback done) {
    done(StartupParams());
}

}  // namespace Startup
