#pragma once

#include "util/SingletonBase.h"
#include "util/SingletonStorage.h"

namespace Util {

// A lazily created process-wide service, deleted by the singleton store at
// shutdown; T derives from Singleton<T>. Main thread only (or first touched
// before other threads start).
template <class T>
class Singleton : public SingletonBase {
public:
    static T* getInstance() {
        if (instance == nullptr) {
            T* created = new T();
            SingletonStorage::addSingleton(created);
            instance = created;
        }
        return instance;
    }
    // Null when none exists (not made yet, or deleted at shutdown); makes
    // nothing.
    static T* getExistingInstance() { return instance; }

protected:
    Singleton() {}
    // Cleared here so that a later getInstance() makes a new object. Only when
    // this is the instance: a class may also be made as a private object (a
    // separate task manager), whose end must not forget the shared one.
    ~Singleton() override {
        if (instance == this) {
            instance = nullptr;
        }
    }

private:
    Singleton(const Singleton&) = delete;
    Singleton& operator=(const Singleton&) = delete;

    static T* instance;
};

template <class T>
T* Singleton<T>::instance = nullptr;

}  // namespace Util
