#include "render/ResourceManager.h"

#include <algorithm>
#include <vector>

#include "render/Resource.h"
#include "render/ResourceDesc.h"
#include "render/ResourceFactory.h"
#include "render/impl/ResourceLinkImpl.h"

namespace Render {

namespace {

const size_t kInitialBuckets = 10;

}  // namespace

ResourceManager::ResourceManager() : device(nullptr), destroyedDuringPump(nullptr) {
    resetContents(contents);
    kdInstallCallback(&ResourceManager::pumpWrapper, KD_EVENT_USER, this);
}

ResourceManager::~ResourceManager() {
    if (destroyedDuringPump != nullptr) {
        *destroyedDuringPump = true;
    }
    // Also discards a pump event still queued for this manager.
    kdInstallCallback(nullptr, KD_EVENT_USER, this);
    for (Contents::const_iterator it = contents.begin(); it != contents.end(); ++it) {
        // Links waiting for removal are still in contents. Their device objects
        // would otherwise stay in the context with nobody left to free them.
        const boost::shared_ptr<Resource>& resource = (*it)->getResource();
        if (resource && resource->isCached()) {
            resource->clear(device);
        }
        if ((*it)->getDesc() != nullptr) {
            (*it)->getDesc()->detachFromManager();
        }
    }
    for (size_t i = 0; i < waitingDescs.size(); ++i) {
        waitingDescs[i]->detachFromManager();
    }
}

void ResourceManager::resetContents(Contents& set) {
    Contents fresh(kInitialBuckets);
    fresh.max_load_factor(1.0f);
    set.swap(fresh);
}

boost::shared_ptr<Resource> ResourceManager::getResource(const ResourceDesc* desc) {
    KD_ASSERT(desc->link);
    if (!desc->link) {
        return boost::shared_ptr<Resource>();
    }
    boost::shared_ptr<Resource> resource = desc->link->getResource();
    if (!resource) {
        return resource;
    }
    if (!resource->isLoaded()) {
        resource->load();
    }
    if (!resource->isCached()) {
        resource->cache(device);
    }
    return resource;
}

void ResourceManager::insertDesc(const ResourceDesc* desc, const boost::shared_ptr<Resource>& resource) {
    // A link the descriptor still holds from an earlier registration must
    // be gone from the manager: from contents, and from the remove list.
    const boost::shared_ptr<ResourceLink>& previous = desc->link;
    bool registered = previous && (contents.count(previous) != 0 || isInRemoveList(previous));
    KD_ASSERT(!registered);
    if (registered) {
        return;
    }
    boost::shared_ptr<Resource> linked = resource;
    if (!linked && desc->getFactory()) {
        linked = desc->getFactory()->create(desc);
    }
    boost::shared_ptr<ResourceLink> link(new ResourceLinkImpl(desc, linked));
    contents.insert(link);
    desc->link = link;
}

void ResourceManager::insertToQueue(const ResourceDesc* desc, const boost::shared_ptr<Resource>& resource) {
    waitingDescs.push_back(desc);
    waitingResources.push_back(resource);
}

void ResourceManager::removeDesc(const ResourceDesc* desc) {
    KD_ASSERT(desc->link);
    if (!desc->link) {
        return;
    }
    // A descriptor that leaves before its ready callback ran must not be
    // called back: its owner may be gone by then.
    removeFromReady(desc);
    boost::shared_ptr<ResourceLink> link = desc->link;
    link->clearDesc();
    scheduleRemove(link);
    desc->link.reset();
}

void ResourceManager::scheduleRemove(const boost::shared_ptr<ResourceLink>& link) {
    KD_ASSERT(link->getDesc() == nullptr);
    KD_ASSERT(contents.count(link) != 0);
    KD_ASSERT(!isInRemoveList(link));
    if (contents.count(link) == 0 || isInRemoveList(link)) {
        return;
    }
    removeList.push_back(link);
}

bool ResourceManager::cancelWaiting(const ResourceDesc* desc) {
    std::deque<const ResourceDesc*>::iterator waiting =
        std::find(waitingDescs.begin(), waitingDescs.end(), desc);
    if (waiting != waitingDescs.end()) {
        waitingResources.erase(waitingResources.begin() + (waiting - waitingDescs.begin()));
        waitingDescs.erase(waiting);
        return true;
    }
    if (std::find(readyDescs.begin(), readyDescs.end(), desc) != readyDescs.end()) {
        removeDesc(desc);
        return true;
    }
    kdHandleAssertion("Could not cancel waiting resource", __FILE__, __LINE__);
    return false;
}

void ResourceManager::process() {
    flushRemoveList(true);
    if (!waitingDescs.empty()) {
        cacheNextWaiting();
    }
}

void ResourceManager::invalidate() {
    // The context is gone, and every GPU object with it: nothing is cleared.
    flushRemoveList(false);
    Contents lost;
    resetContents(lost);
    lost.swap(contents);
    for (Contents::const_iterator it = lost.begin(); it != lost.end(); ++it) {
        const ResourceDesc* desc = (*it)->getDesc();
        KD_ASSERT(desc != nullptr);
        if (desc != nullptr) {
            insertDesc(desc, boost::shared_ptr<Resource>());
        }
    }
}

// A ready callback may destroy the manager (it hides the view, say): the pass
// then stops at once, and so does a pass further out on the stack in whose
// callback this one was pumped.
void ResourceManager::pump() {
    bool destroyed = false;
    bool* const outerPump = destroyedDuringPump;
    destroyedDuringPump = &destroyed;
    while (!readyDescs.empty()) {
        const ResourceDesc* desc = readyDescs.front();
        readyDescs.pop_front();
        desc->notifyReady();
        if (destroyed) {
            if (outerPump != nullptr) {
                *outerPump = true;
            }
            return;
        }
    }
    destroyedDuringPump = outerPump;
}

void ResourceManager::pumpWrapper(const KDEvent* event) {
    static_cast<ResourceManager*>(event->userptr)->pump();
}

bool ResourceManager::isInRemoveList(const boost::shared_ptr<ResourceLink>& link) const {
    return std::find(removeList.begin(), removeList.end(), link) != removeList.end();
}

void ResourceManager::removeFromReady(const ResourceDesc* desc) {
    readyDescs.erase(std::remove(readyDescs.begin(), readyDescs.end(), desc), readyDescs.end());
}

void ResourceManager::flushRemoveList(bool clearResources) {
    for (std::list<boost::shared_ptr<ResourceLink> >::const_iterator it = removeList.begin();
         it != removeList.end(); ++it) {
        const boost::shared_ptr<Resource>& resource = (*it)->getResource();
        if (clearResources && resource && resource->isCached()) {
            resource->clear(device);
        }
        contents.erase(*it);
    }
    removeList.clear();
}

void ResourceManager::cacheNextWaiting() {
    const ResourceDesc* desc = waitingDescs.front();
    boost::shared_ptr<Resource> resource = waitingResources.front();
    waitingDescs.pop_front();
    waitingResources.pop_front();
    KD_ASSERT(resource->isLoaded() && !resource->isCached());
    if (!resource->isCached()) {
        resource->cache(device);
    }
    insertDesc(desc, resource);
    readyDescs.push_back(desc);
    postPump();
}

void ResourceManager::postPump() {
    KDEvent* event = kdCreateEvent();
    event->type = KD_EVENT_USER;
    event->timestamp = kdGetTimeUST();
    event->userptr = this;
    kdPostEvent(event);
}

}  // namespace Render
