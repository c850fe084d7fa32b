#pragma once

#include <KD/kd.h>

#include <boost/shared_ptr.hpp>
#include <boost/unordered_set.hpp>
#include <deque>
#include <list>

namespace Render {

namespace API {
class GraphicsDevice;
}

class Resource;
class ResourceDesc;
class ResourceLink;

// Keeps the resources of one view's descriptors. Required resources are
// loaded and cached when first drawn; optional ones are cached one per
// process() and announced from a posted event after that frame; removals
// wait for the next process(). Drawing (main) thread only.
class ResourceManager {
public:
    ResourceManager();
    // Clears every cached resource through the device (which must still be
    // alive, with its context current, if one is set). Descriptors still
    // registered or queued are detached: they forget this manager and may
    // register with another one.
    ~ResourceManager();

    void setDevice(API::GraphicsDevice* newDevice) { device = newDevice; }
    API::GraphicsDevice* getDevice() const { return device; }

    // The descriptor's resource, loaded and cached now if it is not yet.
    boost::shared_ptr<Resource> getResource(const ResourceDesc* desc);
    // Registers desc; an empty resource is made with the descriptor's factory.
    void insertDesc(const ResourceDesc* desc, const boost::shared_ptr<Resource>& resource);
    // Queues a loaded optional resource for caching.
    void insertToQueue(const ResourceDesc* desc, const boost::shared_ptr<Resource>& resource);
    // Unregisters desc; its resource is cleared at the next process().
    void removeDesc(const ResourceDesc* desc);
    void scheduleRemove(const boost::shared_ptr<ResourceLink>& link);
    // Takes a queued descriptor out of the waiting or ready queue; false
    // (after an assertion) when it is in neither.
    bool cancelWaiting(const ResourceDesc* desc);

    // Once per frame, with the device set and the context current.
    void process();
    // The graphics context was lost: every registered descriptor gets a
    // fresh resource, loaded and cached again when next drawn.
    void invalidate();
    // Runs the ready callbacks of the descriptors cached so far.
    void pump();

    static void pumpWrapper(const KDEvent* event);

    // Registered descriptors, and links waiting for removal.
    size_t getResourceCount() const { return contents.size(); }
    size_t getRemoveCount() const { return removeList.size(); }
    size_t getWaitingCount() const { return waitingDescs.size(); }

private:
    typedef boost::unordered_set<boost::shared_ptr<ResourceLink> > Contents;

    ResourceManager(const ResourceManager&) = delete;
    ResourceManager& operator=(const ResourceManager&) = delete;

    static void resetContents(Contents& set);
    bool isInRemoveList(const boost::shared_ptr<ResourceLink>& link) const;
    void removeFromReady(const ResourceDesc* desc);
    void flushRemoveList(bool clearResources);
    void cacheNextWaiting();
    void postPump();

    Contents contents;
    std::list<boost::shared_ptr<ResourceLink> > removeList;
    std::deque<const ResourceDesc*> waitingDescs;
    std::deque<boost::shared_ptr<Resource> > waitingResources;
    std::deque<const ResourceDesc*> readyDescs;
    API::GraphicsDevice* device;
    // Set while pump() runs, so that a pump whose ready callback destroyed
    // the manager stops touching it.
    bool* destroyedDuringPump;
};

}  // namespace Render
