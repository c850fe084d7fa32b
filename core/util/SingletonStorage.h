#pragma once

#include <vector>

namespace Util {

class SingletonBase;

// Owns every singleton and deletes them in reverse order of creation when the
// platform layer shuts down. Main thread only; not locked.
class SingletonStorage {
public:
    static void addSingleton(SingletonBase* singleton);
    // The platform layer's shutdown hook.
    static void deleteSingletonStorage(void* userdata);

    static bool getWasDestroyed() { return wasDestroyed; }
    static bool getIsDestroying() { return isDestroying; }

    // The store is final once torn down, as a process runs the platform layer
    // once. Programs that start the layer again in the same process (test
    // fixtures) call this before each further start to get a live store for
    // that run; it does nothing when no teardown happened.
    static void resetForNextPalCycle();

private:
    SingletonStorage() {}
    ~SingletonStorage();
    SingletonStorage(const SingletonStorage&) = delete;
    SingletonStorage& operator=(const SingletonStorage&) = delete;

    std::vector<SingletonBase*> singletons;

    static SingletonStorage* instance;
    static bool wasDestroyed;
    static bool isDestroying;
};

}  // namespace Util
