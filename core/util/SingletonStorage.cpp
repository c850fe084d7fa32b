#include "util/SingletonStorage.h"

#include <KD/kdext.h>

#include "util/Logger.h"
#include "util/SingletonBase.h"

namespace Util {

namespace {
const KDint kStorageShutdownOrder = 3;
}

SingletonStorage* SingletonStorage::instance = nullptr;
bool SingletonStorage::wasDestroyed = false;
bool SingletonStorage::isDestroying = false;

void SingletonStorage::addSingleton(SingletonBase* singleton) {
    KD_ASSERT(!wasDestroyed);
    if (isDestroying) {
        Logger::log(Logger::Warning,
                    "SingletonStorage::addSingleton adding singleton when isDestroying == true!");
    }
    if (instance == nullptr) {
        Logger::log(Logger::Debug,
                    "SingletonStorage: managing singleton storage lifecycle with kdAddPalCallbacksZVR");
        instance = new SingletonStorage();
        kdAddPalCallbacksZVR(nullptr, &SingletonStorage::deleteSingletonStorage, kStorageShutdownOrder,
                             nullptr);
    }
    instance->singletons.push_back(singleton);
}

void SingletonStorage::deleteSingletonStorage(void*) {
    KD_ASSERT(instance != nullptr);
    KD_ASSERT(!wasDestroyed);
    KD_ASSERT(!isDestroying);
    // Going on would delete the store twice.
    if (instance == nullptr || isDestroying) {
        return;
    }
    isDestroying = true;
    delete instance;
    wasDestroyed = true;
    isDestroying = false;
    instance = nullptr;
}

void SingletonStorage::resetForNextPalCycle() {
    KD_ASSERT(!isDestroying);
    if (!wasDestroyed) {
        return;
    }
    wasDestroyed = false;
    // The platform layer keeps the shutdown hook for the life of the process,
    // so the next shutdown tears down this store even if no singleton joins.
    // A store made by a registration after the teardown is kept.
    if (instance == nullptr) {
        instance = new SingletonStorage();
    }
}

SingletonStorage::~SingletonStorage() {
    // The vector shrinks before each delete, so a singleton created by a
    // destructor is appended behind the cursor and still deleted in this loop.
    while (!singletons.empty()) {
        SingletonBase* last = singletons.back();
        singletons.pop_back();
        delete last;
    }
}

}  // namespace Util
