#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "TestApp.h"
#include "lifecycle/PauseResumeHandler.h"
#include "lifecycle/PauseResumeListenerWrapper.h"

namespace {

// Registers itself the way library listeners do: it owns the wrapper, the
// handler holds a weak reference.
class JournalListener : public Lifecycle::PauseResumeListener {
public:
    JournalListener(std::vector<std::string>* journal, const std::string& name)
        : journal(journal),
          name(name),
          wrapper(boost::make_shared<Lifecycle::PauseResumeListenerWrapper>(this)) {
        Lifecycle::PauseResumeHandler::getInstance()->addListener(wrapper);
    }

    bool onPaused() override { return note("paused"); }
    bool onResumed() override { return note("resumed"); }
    bool onViewPaused() override { return note("viewPaused"); }
    bool onViewResumed() override { return note("viewResumed"); }

    std::function<void()> action;

private:
    bool note(const std::string& what) {
        journal->push_back(name + "." + what);
        if (action) {
            action();
        }
        return true;
    }

    std::vector<std::string>* journal;
    std::string name;
    boost::shared_ptr<Lifecycle::PauseResumeListenerWrapper> wrapper;
};

class PauseResumeHandlerTest : public LifecycleTest {
protected:
    Lifecycle::PauseResumeHandler* handler() { return Lifecycle::PauseResumeHandler::getInstance(); }
    void deliver(void (*post)()) {
        post();
        pump();
    }
    std::vector<std::string> journal;
};

}  // namespace

TEST_F(PauseResumeHandlerTest, AppEventsReachEveryListenerOnceWithThePausedFlagAlreadySet) {
    JournalListener first(&journal, "first");
    JournalListener second(&journal, "second");
    std::vector<bool> pausedSeen;
    first.action = [&] { pausedSeen.push_back(handler()->getIsAppPaused()); };
    deliver(&pal::postAppResumed);
    deliver(&pal::postAppPaused);
    EXPECT_EQ((std::vector<std::string>{"first.resumed", "second.resumed", "first.paused", "second.paused"}),
              journal);
    EXPECT_EQ((std::vector<bool>{false, true}), pausedSeen);
}

TEST_F(PauseResumeHandlerTest, ViewEventsReachListenersWithTheViewFlagAlreadySetAndLeaveTheAppFlag) {
    JournalListener listener(&journal, "listener");
    std::vector<bool> viewPausedSeen;
    listener.action = [&] { viewPausedSeen.push_back(handler()->getIsViewPaused()); };
    EXPECT_TRUE(handler()->getIsViewPaused());
    deliver(&pal::postViewResumed);
    EXPECT_TRUE(handler()->getIsAppPaused());
    deliver(&pal::postAppResumed);
    deliver(&pal::postViewPaused);
    EXPECT_FALSE(handler()->getIsAppPaused());
    EXPECT_EQ((std::vector<std::string>{"listener.viewResumed", "listener.resumed", "listener.viewPaused"}),
              journal);
    EXPECT_EQ((std::vector<bool>{false, false, true}), viewPausedSeen);
}

TEST_F(PauseResumeHandlerTest, ListenersGoneBeforeOrDuringTheFanOutAreSkippedAndDropped) {
    size_t baseline = handler()->getListenerCount();
    std::unique_ptr<JournalListener> gone(new JournalListener(&journal, "gone"));
    JournalListener killer(&journal, "killer");
    std::unique_ptr<JournalListener> victim(new JournalListener(&journal, "victim"));
    JournalListener last(&journal, "last");
    gone.reset();
    killer.action = [&] { victim.reset(); };
    EXPECT_EQ(baseline + 4, handler()->getListenerCount());
    deliver(&pal::postAppPaused);
    EXPECT_EQ((std::vector<std::string>{"killer.paused", "last.paused"}), journal);
    // A registration whose owner is gone is dropped at the next event.
    EXPECT_EQ(baseline + 3, handler()->getListenerCount());
    deliver(&pal::postAppResumed);
    EXPECT_EQ(baseline + 2, handler()->getListenerCount());
}

TEST_F(PauseResumeHandlerTest, ListenerAddedDuringAFanOutWaitsForTheNextEvent) {
    JournalListener adder(&journal, "adder");
    std::unique_ptr<JournalListener> added;
    adder.action = [&] {
        if (!added) {
            added.reset(new JournalListener(&journal, "added"));
        }
    };
    deliver(&pal::postAppPaused);
    EXPECT_EQ((std::vector<std::string>{"adder.paused"}), journal);
    deliver(&pal::postAppResumed);
    EXPECT_EQ((std::vector<std::string>{"adder.paused", "adder.resumed", "added.resumed"}), journal);
}

TEST_F(PauseResumeHandlerTest, UnexpectedEventTypeAssertsAndReachesNobody) {
    JournalListener listener(&journal, "listener");
    KDEvent event{};
    event.type = KD_EVENT_TIMER;
    handler()->eventCallback(&event);
    expectAssertion("isPauseResumeEvent(event->type)");
    EXPECT_TRUE(journal.empty());
    EXPECT_TRUE(handler()->getIsAppPaused());
}
