#pragma once

#include <KD/kd.h>

#include <boost/weak_ptr.hpp>

#include "FileSystemMountEventHandler.h"
#include "util/WeakListenerList.h"

// Fans storage mount and unmount events out to the handlers registered by
// weak reference. Main thread only.
class FileSystemMountEventDispatcher {
public:
    virtual ~FileSystemMountEventDispatcher() {}

    // The handler stays registered as long as its owner keeps it alive.
    void addHandler(const boost::weak_ptr<FileSystemMountEventHandler>& handler);

    void onFileSystemMountEvent() const;
    void onFileSystemUmountEvent() const;

    static void onFileSystemMountEventWrapper(const KDEvent* event);
    static void onFileSystemUmountEventWrapper(const KDEvent* event);

private:
    // Pruning expired entries during a dispatch does not change what the
    // dispatcher observably holds.
    mutable Util::WeakListenerList<FileSystemMountEventHandler> handlers;
};
