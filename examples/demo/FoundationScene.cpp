// Foundations: singletons created on first use, a periodic timer, and a call
// made on a worker thread that arrives on the main thread.

#include <KD/kdext.h>

#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>

#include "DemoScene.h"
#include "util/Singleton.h"
#include "util/ThreadCallback.h"
#include "util/Timer.h"

namespace {

const long long kTickNs = 200ll * 1000000ll;
const int kTicks = 5;

// Three services that say when they come and go, to show the teardown order.
class TileCatalog : public Util::Singleton<TileCatalog> {
public:
    TileCatalog() { demo::say("singleton TileCatalog created"); }
    ~TileCatalog() override { demo::say("singleton TileCatalog destroyed"); }
};

class TileCache : public Util::Singleton<TileCache> {
public:
    TileCache() { demo::say("singleton TileCache created"); }
    ~TileCache() override { demo::say("singleton TileCache destroyed"); }
};

class TripJournal : public Util::Singleton<TripJournal> {
public:
    TripJournal() { demo::say("singleton TripJournal created"); }
    ~TripJournal() override { demo::say("singleton TripJournal destroyed"); }
};

class SumContext : public Util::ThreadCallback::Context {
public:
    explicit SumContext(long long sum) : sum(sum) {}
    long long sum;
};

// Main thread, apart from workerMain.
class FoundationScene : public DemoScene {
public:
    FoundationScene()
        : ticker(callback<void (*)()>::make<FoundationScene, &FoundationScene::onTick>(this)),
          ticks(0),
          worker(nullptr) {}

    ~FoundationScene() override {
        if (worker != nullptr) {
            kdThreadJoin(worker, nullptr);
        }
    }

    void run(Done done) override {
        finished = done;
        TileCatalog::getInstance();
        TileCache::getInstance();
        TripJournal::getInstance();
        demo::say("starting a periodic Util::Timer, every %lld ms", kTickNs / 1000000);
        ticker.start(Util::Timer::PeriodicAverage, kTickNs);
    }

private:
    void onTick() {
        ++ticks;
        demo::say("timer tick %d of %d", ticks, kTicks);
        if (ticks < kTicks) {
            return;
        }
        ticker.cancel();
        mainThread.reset(new Util::ThreadCallback());
        demo::say("starting a worker thread that posts its result through Util::ThreadCallback");
        worker = kdThreadCreate(nullptr, &FoundationScene::workerMain, this);
    }

    static void* workerMain(void* argument) {
        FoundationScene* self = static_cast<FoundationScene*>(argument);
        long long sum = 0;
        for (int i = 1; i <= 1000000; ++i) {
            sum += i;
        }
        demo::say("worker: computed %lld, posting it to the main thread (on main thread: %s)", sum,
                  kdThreadIsMainZVR() ? "yes" : "no");
        self->mainThread->asyncPerformIfDifferentThread(
            Util::ThreadCallback::Function::make<FoundationScene, &FoundationScene::onSum>(self),
            boost::make_shared<SumContext>(sum));
        return nullptr;
    }

    void onSum(boost::shared_ptr<Util::ThreadCallback::Context> context) {
        demo::say("received %lld (on main thread: %s)", static_cast<SumContext*>(context.get())->sum,
                  kdThreadIsMainZVR() ? "yes" : "no");
        finished();
    }

    Util::Timer ticker;
    int ticks;
    boost::scoped_ptr<Util::ThreadCallback> mainThread;
    KDThread* worker;
    Done finished;
};

DemoSceneRegistration<FoundationScene> registration("Foundations", 10);

}  // namespace
