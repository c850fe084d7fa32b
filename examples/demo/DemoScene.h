#pragma once

#include <vector>

#include "util/callback.h"

// One subsystem's showcase in the demo. Scenes run one after another on the
// main thread, in ascending order, while the application is resumed; each is
// created when its turn comes and deleted when the application shuts down
// (before the singletons are torn down).
//
// A scene file adds itself with one static registration:
//   static DemoSceneRegistration<NetworkScene> registration("Network", 30);
class DemoScene {
public:
    typedef callback<void (*)()> Done;

    virtual ~DemoScene() {}
    // Shows the scene. Call done once when finished: at once, or later from
    // a timer or posted call on the main thread.
    virtual void run(Done done) = 0;
};

struct DemoSceneEntry {
    const char* name;
    int order;
    DemoScene* (*create)();
};

namespace demo {

void registerScene(const DemoSceneEntry& entry);
// The registered scenes, sorted by order.
std::vector<DemoSceneEntry> scenes();

// Prints one line to stdout, prefixed with the milliseconds since start. Any
// thread.
void say(const char* format, ...) __attribute__((format(printf, 1, 2)));

}  // namespace demo

template <class Scene>
class DemoSceneRegistration {
public:
    DemoSceneRegistration(const char* name, int order) { demo::registerScene({name, order, &create}); }

private:
    static DemoScene* create() { return new Scene(); }
};
