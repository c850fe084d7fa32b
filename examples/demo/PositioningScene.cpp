// Network positioning: what the simulated radios see goes to the
// development server's positioning endpoint ("cellid" host from the startup
// answer), which places the phone from its table of known access points and
// cells. Three queries: Wi-Fi and cell at the start of the drive, the cell
// alone, and radios the server has never heard of.
#include <pal/Simulation.h>

#include <string>
#include <vector>

#include "DemoScene.h"
#include "devserver/Server.h"
#include "util/Timer.h"
#include "wireless/LbsNetworkRequest.h"

namespace {

using Wireless::LbsNetworkRequest;

struct Query {
    const char* what;
    std::vector<pal::WifiNetwork> networks;
    pal::CellInfo cell;
};

const pal::CellInfo kParkingCell = {true, 23010, 4021, "26201", "262"};

std::vector<Query> queries() {
    return {
        {"Wi-Fi and cell where the drive starts",
         {{"00:1A:2B:00:00:01", "parking", -48}, {"00:1A:2B:00:00:02", "home", -80}},
         kParkingCell},
        {"the cell alone (Wi-Fi switched off)", {}, kParkingCell},
        {"radios the server does not know",
         {{"02:00:5E:10:20:30", "elsewhere", -60}},
         {true, 999, 77, "20801", "208"}},
    };
}

// Main thread.
class PositioningScene : public DemoScene {
public:
    PositioningScene()
        : next(0), nextTimer(callback<void (*)()>::make<PositioningScene, &PositioningScene::ask>(this)) {}

    void run(Done done) override {
        finished = done;
        ask();
    }

private:
    void ask() {
        const std::vector<Query> all = queries();
        if (next == all.size()) {
            finished();
            return;
        }
        const Query& query = all[next++];
        demo::say("asking the server with %s", query.what);
        pal::scriptWifiScan(pal::Answer::after(30 * 1000000ull), query.networks);
        pal::scriptCellInfo(pal::Answer::after(10 * 1000000ull), query.cell);
        pal::scriptSignalStrength(pal::Answer::after(5 * 1000000ull), true, -75);
        request.submit(
            LbsNetworkRequest::Callback::make<PositioningScene, &PositioningScene::onResponse>(this));
    }

    void onResponse(const LbsNetworkRequest::Response& response) {
        const DevServer::Journal journal = demo::server().journal();
        if (!journal.positionings.empty()) {
            const DevServer::PositioningRecord& record = journal.positionings.back();
            for (const DevServer::SeenRadio& radio : record.radios) {
                demo::say("  server: %-4s %-14s %4d dBm  %s", radio.kind.c_str(), radio.id.c_str(),
                          radio.signal, radio.known ? "known" : "unknown");
            }
        }
        if (response.error == 0) {
            demo::say("  -> %.6f, %.6f  +-%.0f m", response.latitude, response.longitude, response.accuracy);
        } else {
            demo::say("  -> no position: error %d", response.error);
        }
        // The next query starts from the event loop, outside the request's
        // callback.
        nextTimer.start(Util::Timer::OneShot, 0);
    }

    Done finished;
    size_t next;
    LbsNetworkRequest request;
    Util::Timer nextTimer;
};

DemoSceneRegistration<PositioningScene> registration("Network positioning", 59);

}  // namespace
