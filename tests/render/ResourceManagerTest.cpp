// The render resource manager on the main thread of a running platform
// layer: ready callbacks arrive through posted events, so pump() stands for
// the event loop between two frames.
#include <KD/kd.h>

#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <list>
#include <map>
#include <string>
#include <vector>

#include "render/Resource.h"
#include "render/ResourceDesc.h"
#include "render/ResourceFactory.h"
#include "render/ResourceManager.h"
#include "support/PalTest.h"

namespace {

using Render::ResourceDesc;

typedef std::vector<std::string> Journal;

// The manager only hands the device on; the resources compare against this
// address.
char deviceToken;
Render::API::GraphicsDevice* const kDevice = reinterpret_cast<Render::API::GraphicsDevice*>(&deviceToken);

class TestResource : public Render::Resource {
public:
    TestResource(const std::string& name, Journal& journal) : name(name), journal(journal) {}

    Render::API::GraphicsDevice* device = nullptr;

protected:
    void doLoad() override { journal.push_back("load " + name); }
    void doCache(Render::API::GraphicsDevice* cacheDevice) override {
        device = cacheDevice;
        journal.push_back("cache " + name);
    }
    void doClear(Render::API::GraphicsDevice*) override { journal.push_back("clear " + name); }

private:
    std::string name;
    Journal& journal;
};

// Names every resource after its descriptor and how many it made for it.
class TestFactory : public Render::ResourceFactory {
public:
    explicit TestFactory(Journal& journal) : journal(journal) {}

    boost::shared_ptr<Render::Resource> create(const ResourceDesc* desc) override {
        ++created;
        return boost::make_shared<TestResource>(names[desc] + "#" + std::to_string(created), journal);
    }

    std::map<const ResourceDesc*, std::string> names;
    int created = 0;

private:
    Journal& journal;
};

struct ReadyNote {
    Journal* journal;
    std::string name;
};

void onReady(void* userData) {
    ReadyNote* note = static_cast<ReadyNote*>(userData);
    note->journal->push_back("ready " + note->name);
}

// A ready callback that hides the view, and the view's manager with it.
struct ManagerDestroyer {
    boost::scoped_ptr<Render::ResourceManager>* manager;
    Journal* journal;
};

void destroyManagerWhenReady(void* userData) {
    ManagerDestroyer* destroyer = static_cast<ManagerDestroyer*>(userData);
    destroyer->journal->push_back("ready, destroying the manager");
    destroyer->manager->reset();
}

class ResourceManagerTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        factory = boost::make_shared<TestFactory>(journal);
        manager.reset(new Render::ResourceManager());
        manager->setDevice(kDevice);
    }

    void TearDown() override {
        descs.clear();
        manager.reset();
        PalTest::TearDown();
    }

    boost::shared_ptr<ResourceDesc> makeDesc(const std::string& name, ResourceDesc::Usage usage) {
        boost::shared_ptr<ResourceDesc> desc = boost::make_shared<ResourceDesc>(factory, usage);
        factory->names[desc.get()] = name;
        descs.push_back(desc);
        return desc;
    }

    // An optional descriptor loaded ahead and queued for caching.
    boost::shared_ptr<ResourceDesc> queueOptional(const std::string& name) {
        boost::shared_ptr<ResourceDesc> desc = makeDesc(name, ResourceDesc::OPTIONAL);
        desc->setResourceManager(manager.get());
        desc->loadResource();
        cache(desc, name);
        return desc;
    }

    void cache(const boost::shared_ptr<ResourceDesc>& desc, const std::string& name) {
        notes.push_back(ReadyNote{&journal, name});
        desc->cacheResource(ResourceDesc::ReadyCallback::make<&onReady>(), &notes.back());
    }

    void frame() {
        manager->process();
        journal.push_back("frame");
        pump();
    }

    Journal journal;
    boost::shared_ptr<TestFactory> factory;
    boost::scoped_ptr<Render::ResourceManager> manager;
    std::vector<boost::shared_ptr<ResourceDesc> > descs;
    std::list<ReadyNote> notes;
};

TEST_F(ResourceManagerTest, RequiredResourceIsLoadedAndCachedWhenFirstDrawn) {
    boost::shared_ptr<ResourceDesc> desc = makeDesc("a", ResourceDesc::REQUIRED);

    boost::shared_ptr<Render::Resource> first = desc->getResource(manager.get());
    boost::shared_ptr<Render::Resource> again = desc->getResource(manager.get());

    ASSERT_TRUE(first);
    EXPECT_EQ(first, again);
    EXPECT_TRUE(first->isLoaded());
    EXPECT_TRUE(first->isCached());
    EXPECT_EQ(static_cast<TestResource*>(first.get())->device, kDevice);
    EXPECT_EQ(journal, (Journal{"load a#1", "cache a#1"}));
    EXPECT_TRUE(desc->isInitialized());
    EXPECT_EQ(manager->getResourceCount(), 1u);
}

TEST_F(ResourceManagerTest, OptionalResourcesBecomeReadyOnePerFrameWithCallbacksAfterEachFrame) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    queueOptional("b");
    queueOptional("c");
    EXPECT_EQ(journal, (Journal{"load a#1", "load b#2", "load c#3"}));
    journal.clear();

    frame();
    frame();
    frame();
    frame();

    EXPECT_EQ(journal, (Journal{"cache a#1", "frame", "ready a", "cache b#2", "frame", "ready b", "cache c#3",
                                "frame", "ready c", "frame"}));
    EXPECT_EQ(manager->getResourceCount(), 3u);
    EXPECT_EQ(manager->getWaitingCount(), 0u);

    // Cached ahead, drawn without loading again.
    journal.clear();
    boost::shared_ptr<Render::Resource> resource = a->getResource(manager.get());
    ASSERT_TRUE(resource);
    EXPECT_TRUE(resource->isCached());
    EXPECT_TRUE(journal.empty());
}

TEST_F(ResourceManagerTest, CancellingWaitingDescriptorRemovesBothQueueEntries) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    queueOptional("b");
    journal.clear();

    a->cancelResource();
    frame();
    frame();

    EXPECT_EQ(journal, (Journal{"cache b#2", "frame", "ready b", "frame"}));
    EXPECT_FALSE(a->isInitialized());
    EXPECT_EQ(manager->getResourceCount(), 1u);

    // A cancelled descriptor may be queued again.
    journal.clear();
    a->loadResource();
    cache(a, "a");
    frame();
    EXPECT_EQ(journal, (Journal{"load a#3", "cache a#3", "frame", "ready a"}));
}

TEST_F(ResourceManagerTest, CancellingReadyDescriptorSchedulesRemovalAndItsCallbackNeverRuns) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    journal.clear();
    manager->process();

    a->cancelResource();
    pump();
    EXPECT_EQ(journal, (Journal{"cache a#1"}));
    EXPECT_EQ(manager->getRemoveCount(), 1u);

    manager->process();
    EXPECT_EQ(journal, (Journal{"cache a#1", "clear a#1"}));
    EXPECT_EQ(manager->getResourceCount(), 0u);
}

TEST_F(ResourceManagerTest, CancellingUnknownDescriptorIsReported) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    frame();

    a->cancelResource();

    expectAssertion("Could not cancel waiting resource");
    // Still registered: it leaves through shutdownResource().
    EXPECT_TRUE(a->isInitialized());
    EXPECT_EQ(manager->getResourceCount(), 1u);
}

TEST_F(ResourceManagerTest, RemovalWaitsForNextProcessAndHappensOnceAndTheDescriptorCanBeDrawnAgain) {
    boost::shared_ptr<ResourceDesc> a = makeDesc("a", ResourceDesc::REQUIRED);
    a->getResource(manager.get());
    journal.clear();

    a->shutdownResource();
    a->shutdownResource();
    EXPECT_TRUE(journal.empty());
    EXPECT_EQ(manager->getRemoveCount(), 1u);

    manager->process();
    manager->process();
    EXPECT_EQ(journal, (Journal{"clear a#1"}));
    EXPECT_EQ(manager->getResourceCount(), 0u);
    EXPECT_EQ(manager->getRemoveCount(), 0u);

    journal.clear();
    ASSERT_TRUE(a->getResource(manager.get()));
    EXPECT_EQ(journal, (Journal{"load a#2", "cache a#2"}));
}

TEST_F(ResourceManagerTest, InvalidateGivesEveryDescriptorFreshResourceWithoutClearing) {
    boost::shared_ptr<ResourceDesc> a = makeDesc("a", ResourceDesc::REQUIRED);
    boost::shared_ptr<ResourceDesc> b = makeDesc("b", ResourceDesc::REQUIRED);
    boost::shared_ptr<Render::Resource> lost = a->getResource(manager.get());
    b->getResource(manager.get());
    b->shutdownResource();
    journal.clear();

    manager->invalidate();
    EXPECT_TRUE(journal.empty());
    EXPECT_EQ(manager->getResourceCount(), 1u);
    EXPECT_EQ(manager->getRemoveCount(), 0u);

    boost::shared_ptr<Render::Resource> fresh = a->getResource(manager.get());
    ASSERT_TRUE(fresh);
    EXPECT_NE(fresh, lost);
    EXPECT_TRUE(fresh->isCached());
    EXPECT_EQ(journal, (Journal{"load a#3", "cache a#3"}));

    manager->process();
    EXPECT_EQ(journal, (Journal{"load a#3", "cache a#3"}));
}

TEST_F(ResourceManagerTest, ShuttingDownQueuedDescriptorTakesItOutOfTheQueue) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    journal.clear();

    a->shutdownResource();
    frame();

    EXPECT_EQ(journal, (Journal{"frame"}));
    EXPECT_EQ(manager->getWaitingCount(), 0u);
}

TEST_F(ResourceManagerTest, DestroyedDescriptorLeavesManagerAndIsNotCalledBack) {
    boost::shared_ptr<ResourceDesc> a = queueOptional("a");
    manager->process();
    journal.clear();

    descs.clear();
    a.reset();
    pump();
    manager->process();
    manager->invalidate();

    EXPECT_EQ(journal, (Journal{"clear a#1"}));
    EXPECT_EQ(manager->getResourceCount(), 0u);
}

TEST_F(ResourceManagerTest, ManagerDestroyedByAReadyCallbackCallsNoMoreBack) {
    boost::shared_ptr<ResourceDesc> a = makeDesc("a", ResourceDesc::OPTIONAL);
    a->setResourceManager(manager.get());
    a->loadResource();
    ManagerDestroyer destroyer{&manager, &journal};
    a->cacheResource(ResourceDesc::ReadyCallback::make<&destroyManagerWhenReady>(), &destroyer);
    queueOptional("b");
    // Both ready before the event loop runs: one pass would call both back.
    manager->process();
    manager->process();
    journal.clear();

    pump();

    EXPECT_FALSE(manager);
    // The destroyed manager cleared its resources, and called nobody else.
    Journal readyCalls;
    for (const std::string& entry : journal) {
        if (entry.compare(0, 5, "ready") == 0) {
            readyCalls.push_back(entry);
        }
    }
    EXPECT_EQ(readyCalls, (Journal{"ready, destroying the manager"}));
}

TEST_F(ResourceManagerTest, DescriptorOutlivingItsManagerCanJoinAnotherOne) {
    boost::shared_ptr<ResourceDesc> a = makeDesc("a", ResourceDesc::REQUIRED);
    boost::shared_ptr<ResourceDesc> queued = queueOptional("b");
    a->getResource(manager.get());

    manager.reset(new Render::ResourceManager());
    EXPECT_FALSE(a->isInitialized());
    EXPECT_FALSE(queued->isInitialized());

    EXPECT_TRUE(a->getResource(manager.get()));
    a->shutdownResource();
    queued->shutdownResource();
}

TEST_F(ResourceManagerTest, OptionalResourceLoadedOnWorkerThreadIsCachedOnMainThread) {
    boost::shared_ptr<ResourceDesc> a = makeDesc("a", ResourceDesc::OPTIONAL);
    a->setResourceManager(manager.get());
    struct Loader {
        static void* run(void* desc) {
            static_cast<ResourceDesc*>(desc)->loadResource();
            return kdThreadIsMainZVR() ? nullptr : desc;
        }
    };
    KDThread* worker = kdThreadCreate(nullptr, &Loader::run, a.get());
    ASSERT_NE(worker, nullptr);
    void* result = nullptr;
    kdThreadJoin(worker, &result);
    EXPECT_EQ(result, a.get());

    cache(a, "a");
    frame();

    EXPECT_EQ(journal, (Journal{"load a#1", "cache a#1", "frame", "ready a"}));
}

TEST_F(ResourceManagerTest, MisuseIsReportedAndRefused) {
    boost::shared_ptr<ResourceDesc> required = makeDesc("r", ResourceDesc::REQUIRED);
    required->setResourceManager(manager.get());
    expectAssertion("usage == OPTIONAL");

    boost::shared_ptr<Render::Resource> resource = required->getResource(manager.get());
    resource->load();
    expectAssertion("!loaded");
    resource->cache(kDevice);
    expectAssertion("!cached");

    Render::ResourceManager other;
    EXPECT_FALSE(required->getResource(&other));
    expectAssertion("resourceManager == manager");

    boost::shared_ptr<ResourceDesc> unqueued = makeDesc("u", ResourceDesc::OPTIONAL);
    unqueued->setResourceManager(manager.get());
    unqueued->cacheResource(ResourceDesc::ReadyCallback(), nullptr);
    expectAssertion("loadingResource");
    EXPECT_FALSE(unqueued->isInitialized());

    EXPECT_EQ(journal, (Journal{"load r#1", "cache r#1"}));
}

}  // namespace
