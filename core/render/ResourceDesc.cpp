#include "render/ResourceDesc.h"

#include <KD/kd.h>

#include "render/Resource.h"
#include "render/ResourceFactory.h"
#include "render/ResourceLink.h"
#include "render/ResourceManager.h"

namespace Render {

ResourceDesc::ResourceDesc(const boost::shared_ptr<ResourceFactory>& factory, Usage usage)
    : factory(factory),
      usage(usage),
      initialized(false),
      resourceManager(nullptr),
      readyCallback(),
      readyUserData(nullptr) {}

ResourceDesc::~ResourceDesc() {
    // The manager keeps a plain pointer to this descriptor in its link or
    // queues; leaving it there would hand a dead descriptor to the next
    // frame or ready callback.
    if (initialized && resourceManager != nullptr) {
        shutdownResource();
    }
}

void ResourceDesc::loadResource() const {
    KD_ASSERT(!initialized && !loadingResource);
    if (initialized || loadingResource || !factory) {
        return;
    }
    boost::shared_ptr<Resource> resource = factory->create(this);
    if (resource) {
        resource->load();
    }
    loadingResource = resource;
}

void ResourceDesc::setResourceManager(ResourceManager* manager) {
    KD_ASSERT(usage == OPTIONAL);
    if (usage != OPTIONAL) {
        return;
    }
    resourceManager = manager;
}

void ResourceDesc::cacheResource(ReadyCallback callback, void* userData) const {
    KD_ASSERT(!initialized);
    KD_ASSERT(usage == OPTIONAL);
    KD_ASSERT(loadingResource);
    KD_ASSERT(resourceManager != nullptr);
    if (initialized || usage != OPTIONAL || !loadingResource || resourceManager == nullptr) {
        return;
    }
    readyCallback = callback;
    readyUserData = userData;
    resourceManager->insertToQueue(this, loadingResource);
    loadingResource.reset();
    initialized = true;
}

void ResourceDesc::cancelResource() const {
    KD_ASSERT(initialized);
    KD_ASSERT(usage == OPTIONAL);
    KD_ASSERT(!loadingResource);
    if (!initialized || resourceManager == nullptr) {
        return;
    }
    if (resourceManager->cancelWaiting(this)) {
        initialized = false;
        readyCallback = ReadyCallback();
        readyUserData = nullptr;
    }
}

boost::shared_ptr<Resource> ResourceDesc::getResource(ResourceManager* manager) const {
    KD_ASSERT(manager != nullptr);
    if (manager == nullptr) {
        return boost::shared_ptr<Resource>();
    }
    if (!initialized) {
        // Registering again with the same manager (after a shutdown, or an
        // optional descriptor drawn before it was queued) is harmless; a
        // second manager is not.
        KD_ASSERT(resourceManager == nullptr || resourceManager == manager);
        if (resourceManager != nullptr && resourceManager != manager) {
            return boost::shared_ptr<Resource>();
        }
        resourceManager = manager;
        manager->insertDesc(this, loadingResource);
        loadingResource.reset();
        initialized = true;
    }
    KD_ASSERT(resourceManager == manager);
    if (resourceManager != manager) {
        return boost::shared_ptr<Resource>();
    }
    return manager->getResource(this);
}

void ResourceDesc::shutdownResource() const {
    if (!initialized) {
        return;
    }
    initialized = false;
    readyCallback = ReadyCallback();
    readyUserData = nullptr;
    KD_ASSERT(resourceManager != nullptr);
    if (resourceManager == nullptr) {
        return;
    }
    // A queued optional descriptor has no link yet: it leaves the queue.
    if (link) {
        resourceManager->removeDesc(this);
    } else {
        resourceManager->cancelWaiting(this);
    }
}

void ResourceDesc::notifyReady() const {
    // Cleared before the call, so the callback may queue the descriptor again.
    ReadyCallback callback = readyCallback;
    void* userData = readyUserData;
    readyCallback = ReadyCallback();
    readyUserData = nullptr;
    callback(userData);
}

void ResourceDesc::detachFromManager() const {
    initialized = false;
    resourceManager = nullptr;
    link.reset();
    readyCallback = ReadyCallback();
    readyUserData = nullptr;
}

}  // namespace Render
