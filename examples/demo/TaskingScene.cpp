// Tasking: checksums of a few megabytes computed on the task manager's worker
// thread while the main thread stays free; each result comes back on the main
// thread. Low-priority mode holds the ordinary tasks back until the urgent
// one is done.

#include <KD/kdext.h>
#include <zlib.h>

#include <boost/make_shared.hpp>
#include <boost/scoped_ptr.hpp>
#include <cstdint>
#include <vector>

#include "DemoScene.h"
#include "tasking/TaskHolder.h"
#include "tasking/TaskManager.h"

namespace {

const int kChunks = 4;
const size_t kChunkBytes = 2 * 1024 * 1024;
const int kUrgentChunk = 3;

class TaskingScene;

// Checksums one chunk of data on the worker; the result is read on the main
// thread after run() has returned.
class ChecksumTask : public Tasking::Task {
public:
    ChecksumTask(TaskingScene* scene, int index, std::vector<std::uint8_t> data)
        : scene(scene), index(index), data(std::move(data)), checksum(0), ranOnMain(true) {}

    void run() override {
        ranOnMain = kdThreadIsMainZVR();
        checksum = crc32(crc32(0L, Z_NULL, 0), data.data(), static_cast<uInt>(data.size()));
    }
    void onFinished() override;

    TaskingScene* const scene;
    const int index;
    const std::vector<std::uint8_t> data;
    uLong checksum;
    bool ranOnMain;
};

// Main thread only. The holders cancel what is still pending when the scene
// is deleted, so no task reports to a deleted scene.
class TaskingScene : public DemoScene {
public:
    TaskingScene() : remaining(0) {}

    void run(Done done) override {
        finished = done;
        Tasking::TaskManager* manager = Tasking::TaskManager::getInstance();
        demo::say(
            "enabling low-priority mode: the worker drops to the background class and holds back "
            "priority-0 tasks");
        manager->enableLowProirityMode();
        for (int i = 0; i < kChunks; ++i) {
            const int priority = i == kUrgentChunk ? 1 : 0;
            demo::say("submitting checksum of chunk %d (%zu bytes) at priority %d", i, kChunkBytes, priority);
            holders[i].reset(new Tasking::TaskHolder(true));
            holders[i]->submit(boost::make_shared<ChecksumTask>(this, i, makeChunk(i)), priority);
            ++remaining;
        }
        demo::say("main thread is free while the worker computes");
    }

    void onChecksum(ChecksumTask& task) {
        holders[task.index]->onFinished();
        demo::say(
            "chunk %d: crc32 0x%08lx, computed on the main thread: %s, delivered on the main thread: %s",
            task.index, task.checksum, task.ranOnMain ? "yes" : "no", kdThreadIsMainZVR() ? "yes" : "no");
        if (task.index == kUrgentChunk) {
            demo::say("urgent chunk done; disabling low-priority mode so the held-back tasks run");
            Tasking::TaskManager::getInstance()->disableLowPriorityMode();
        }
        if (--remaining == 0) {
            finished();
        }
    }

private:
    // Deterministic filler, so that the checksums are the same on every run.
    static std::vector<std::uint8_t> makeChunk(int index) {
        std::vector<std::uint8_t> chunk(kChunkBytes);
        std::uint32_t state = 2166136261u + static_cast<std::uint32_t>(index);
        for (std::uint8_t& byte : chunk) {
            state = state * 1664525u + 1013904223u;
            byte = static_cast<std::uint8_t>(state >> 24);
        }
        return chunk;
    }

    boost::scoped_ptr<Tasking::TaskHolder> holders[kChunks];
    int remaining;
    Done finished;
};

void ChecksumTask::onFinished() {
    scene->onChecksum(*this);
}

DemoSceneRegistration<TaskingScene> registration("Tasking", 30);

}  // namespace
