#include "FileSystemMountEventDispatcher.h"

#include "BaseApp.h"

void FileSystemMountEventDispatcher::addHandler(const boost::weak_ptr<FileSystemMountEventHandler>& handler) {
    handlers.add(handler);
}

void FileSystemMountEventDispatcher::onFileSystemMountEvent() const {
    handlers.notifyAll([](FileSystemMountEventHandler& handler) { handler.onMounted(); });
}

void FileSystemMountEventDispatcher::onFileSystemUmountEvent() const {
    handlers.notifyAll([](FileSystemMountEventHandler& handler) { handler.onUnmounted(); });
}

// The application leaves these installed when it shuts down, so an event may
// find no application; BaseApp::get() reports that.
void FileSystemMountEventDispatcher::onFileSystemMountEventWrapper(const KDEvent*) {
    BaseApp* app = BaseApp::get();
    if (app != nullptr) {
        app->getFileSystemEventDispatcher()->onFileSystemMountEvent();
    }
}

void FileSystemMountEventDispatcher::onFileSystemUmountEventWrapper(const KDEvent*) {
    BaseApp* app = BaseApp::get();
    if (app != nullptr) {
        app->getFileSystemEventDispatcher()->onFileSystemUmountEvent();
    }
}
