#include <pal/Simulation.h>

#include <boost/make_shared.hpp>
#include <functional>
#include <string>
#include <vector>

#include "FileSystemMountEventDispatcher.h"
#include "TestApp.h"

namespace {

class JournalHandler : public FileSystemMountEventHandler {
public:
    JournalHandler(std::vector<std::string>* journal, const std::string& name)
        : journal(journal), name(name) {}

    void onUnmounted() override { note("unmounted"); }
    void onMounted() override { note("mounted"); }

    std::function<void()> action;

private:
    void note(const std::string& what) {
        journal->push_back(name + "." + what);
        if (action) {
            action();
        }
    }

    std::vector<std::string>* journal;
    std::string name;
};

class FileSystemMountEventDispatcherTest : public LifecycleTest {
protected:
    boost::shared_ptr<JournalHandler> addHandler(const std::string& name) {
        boost::shared_ptr<JournalHandler> handler = boost::make_shared<JournalHandler>(&journal, name);
        TestApp::get()->getFileSystemEventDispatcher()->addHandler(handler);
        return handler;
    }
    std::vector<std::string> journal;
};

}  // namespace

TEST_F(FileSystemMountEventDispatcherTest, StorageEventsReachEveryLiveHandler) {
    boost::shared_ptr<JournalHandler> first = addHandler("first");
    boost::shared_ptr<JournalHandler> second = addHandler("second");
    pal::postStorageUnmounted();
    pal::postStorageMounted();
    pump();
    EXPECT_EQ(
        (std::vector<std::string>{"first.unmounted", "second.unmounted", "first.mounted", "second.mounted"}),
        journal);
}

TEST_F(FileSystemMountEventDispatcherTest, HandlersGoneBeforeOrDuringTheFanOutAreSkipped) {
    boost::shared_ptr<JournalHandler> gone = addHandler("gone");
    boost::shared_ptr<JournalHandler> killer = addHandler("killer");
    boost::shared_ptr<JournalHandler> victim = addHandler("victim");
    gone.reset();
    killer->action = [&] { victim.reset(); };
    pal::postStorageUnmounted();
    pump();
    EXPECT_EQ((std::vector<std::string>{"killer.unmounted"}), journal);
}

TEST_F(FileSystemMountEventDispatcherTest, StorageEventWithoutAnAppAssertsAndIsIgnored) {
    shutdownPal();
    KDEvent event{};
    event.type = KD_EVENT_FS_MOUNTED_ZVR;
    FileSystemMountEventDispatcher::onFileSystemMountEventWrapper(&event);
    expectAssertion("app != nullptr");
}
