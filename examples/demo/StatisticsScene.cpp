// The Wi-Fi pool collector, switched on by the startup answer, has been
// collecting chunks in the background since the startup scene: the radios
// and the last fix every second, the timings of the requests made meanwhile,
// an upload every few seconds. The development server undoes the scrambling,
// gunzips and parses each upload; this scene shows what it decoded so far and
// waits for one more upload to arrive.
#include <string>
#include <vector>

#include "DemoScene.h"
#include "devserver/Server.h"
#include "util/Timer.h"

namespace {

const long long kPollNs = 100 * 1000000ll;

std::string joined(const std::vector<std::string>& values) {
    std::string text;
    for (const std::string& value : values) {
        text += (text.empty() ? "" : ",") + value;
    }
    return text;
}

// Main thread.
class StatisticsScene : public DemoScene {
public:
    StatisticsScene()
        : shown(0),
          wanted(0),
          pollTimer(callback<void (*)()>::make<StatisticsScene, &StatisticsScene::poll>(this)) {}

    void run(Done done) override {
        finished = done;
        wanted = demo::server().journal().uploads.size() + 1;
        demo::say("uploads the server decoded so far, then one more:");
        pollTimer.start(Util::Timer::PeriodicAverage, kPollNs);
        poll();
    }

private:
    void poll() {
        const DevServer::Journal journal = demo::server().journal();
        for (; shown < journal.uploads.size(); ++shown) {
            show(journal.uploads[shown]);
        }
        if (shown >= wanted) {
            pollTimer.cancel();
            finished();
        }
    }

    static void show(const DevServer::UploadRecord& upload) {
        if (!upload.accepted) {
            demo::say("  server refused an upload of %zu bytes: %d %s", upload.bytes, upload.status,
                      upload.reason.c_str());
            return;
        }
        demo::say("  server decoded %zu bytes from uuid %s, model \"%s\": %d chunks (%s), %d access points",
                  upload.bytes, upload.uuid.c_str(), upload.model.c_str(), upload.chunks,
                  joined(upload.chunkTypes).c_str(), upload.accessPoints);
        demo::say("    document: %s", excerpt(upload.document).c_str());
    }

    // The start of a decoded document, enough to see its shape.
    static std::string excerpt(const std::string& document) {
        const size_t limit = 160;
        const size_t start = document.find("<wifipool");
        std::string text = document.substr(start == std::string::npos ? 0 : start);
        return text.size() > limit ? text.substr(0, limit) + "..." : text;
    }

    Done finished;
    size_t shown;
    size_t wanted;
    Util::Timer pollTimer;
};

DemoSceneRegistration<StatisticsScene> registration("Statistics", 65);

}  // namespace
