#pragma once

#include <string>
#include <utility>
#include <vector>

#include "util/callback.h"

namespace DevServer {
class Server;
}

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

// The development server on 127.0.0.1 that stands in for the startup,
// positioning and statistics servers; main starts it before the application
// and stops it after. Any thread.
DevServer::Server& server();
// The folder for what the demo leaves behind; it outlives the run.
const std::string& outputFolder();

// Lines of the final summary. Any thread.
// A file the scene wrote, with what it holds.
void noteFile(const std::string& path, const std::string& what);
// Adds amount to a named count; counts are listed in the order first noted.
void addCount(const std::string& name, int amount = 1);

// For main: the environment of the scenes, and what they noted.
void setEnvironment(DevServer::Server* server, const std::string& outputFolder);
std::vector<std::pair<std::string, std::string> > notedFiles();
std::vector<std::pair<std::string, int> > counts();

}  // namespace demo

template <class Scene>
class DemoSceneRegistration {
public:
    DemoSceneRegistration(const char* name, int order) { demo::registerScene({name, order, &create}); }

private:
    static DemoScene* create() { return new Scene(); }
};
