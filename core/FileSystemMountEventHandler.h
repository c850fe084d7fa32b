#pragma once

// Implemented by the application to hear about external storage going away
// and coming back. Called on the main thread.
class FileSystemMountEventHandler {
public:
    virtual ~FileSystemMountEventHandler() {}
    virtual void onUnmounted() = 0;
    virtual void onMounted() = 0;
};
