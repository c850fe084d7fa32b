#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/shared_ptr.hpp>

#include "util/callback.h"

namespace Render {

class Resource;
class ResourceFactory;
class ResourceLink;
class ResourceManager;

// Describes one resource a view draws with; the resource itself is made by
// the factory and kept by the manager the descriptor registers with.
//
// Required descriptors are loaded and cached on demand by getResource().
// Optional ones are loaded ahead (loadResource, possibly on a worker thread),
// queued with cacheResource, cached one per frame by the manager, and then
// announced through the ready callback.
//
// Threads: loadResource() on any one thread at a time; everything else on the
// drawing (main) thread, after the loading thread has finished.
class ResourceDesc : public boost::enable_shared_from_this<ResourceDesc> {
public:
    typedef int Usage;
    static constexpr Usage REQUIRED = 0;
    static constexpr Usage OPTIONAL = 1;

    typedef callback<void (*)(void*)> ReadyCallback;

    ResourceDesc(const boost::shared_ptr<ResourceFactory>& factory, Usage usage);
    // Leaves the manager it is registered with or queued in.
    virtual ~ResourceDesc();

    const boost::shared_ptr<ResourceFactory>& getFactory() const { return factory; }
    Usage getUsage() const { return usage; }
    bool isInitialized() const { return initialized; }

    // Optional path: creates and loads the resource ahead of caching.
    void loadResource() const;
    void setResourceManager(ResourceManager* manager);
    // Queues the loaded resource; callback(userData) runs after the frame
    // that cached it, unless the descriptor is cancelled or shut down first.
    void cacheResource(ReadyCallback callback, void* userData) const;
    void cancelResource() const;

    // The resource, loaded and cached; registers the descriptor with manager
    // on first use. Empty when the factory made none.
    boost::shared_ptr<Resource> getResource(ResourceManager* manager) const;
    // Leaves the manager; the resource is released at its next frame.
    void shutdownResource() const;
    void notifyReady() const;

private:
    friend class ResourceManager;

    ResourceDesc(const ResourceDesc&) = delete;
    ResourceDesc& operator=(const ResourceDesc&) = delete;

    // Called by a manager that goes away while this descriptor is still in it.
    void detachFromManager() const;

    boost::shared_ptr<ResourceFactory> factory;
    Usage usage;
    mutable boost::shared_ptr<Resource> loadingResource;
    mutable bool initialized;
    mutable ResourceManager* resourceManager;
    mutable boost::shared_ptr<ResourceLink> link;
    mutable ReadyCallback readyCallback;
    mutable void* readyUserData;
};

}  // namespace Render
