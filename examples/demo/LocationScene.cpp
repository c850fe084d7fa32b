// Location: a short drive replayed from a GPX file (examples/demo/data,
// written by make_tunnel_drive.py) as simulated satellite fixes, fifteen times
// faster than driven. In the tunnel the receiver loses its fix; the location
// manager hands over to network positioning, which asks the development
// server (the "cellid" host of the startup answer) with the simulated Wi-Fi
// and cell of the tunnel; out of the tunnel the satellite fixes take over
// again. Every handover and every filtered position the application would see
// is printed, and each handover with how long it took: from the last
// satellite fix to the first network position, and from there back to the
// first satellite fix.
#include <pal/Simulation.h>

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "DemoScene.h"
#include "devserver/Server.h"
#include "location/LocationManager.h"
#include "location/simulator/GpxPlayer.h"
#include "location/simulator/GpxReader.h"
#include "startup/StartupData.h"
#include "util/Timer.h"

namespace {

using Location::LocationManager;

const float kReplayRate = 15.0f;

const char* precisionName(int precision) {
    switch (precision) {
        case Location::PrecisionSatellite:
            return "satellite";
        case Location::PrecisionNetwork:
            return "network";
        default:
            return "none";
    }
}

// Main thread.
class LocationScene : public DemoScene, public Location::LocationListener {
public:
    LocationScene()
        : manager(nullptr),
          positions(0),
          queriesBefore(0),
          lastPrecision(-1),
          lastSatelliteFixAt(0),
          firstNetworkPositionAt(0),
          finishTimer(callback<void (*)()>::make<LocationScene, &LocationScene::finish>(this)) {}

    ~LocationScene() override { detach(); }

    void run(Done done) override {
        finished = done;
        std::vector<Simulator::GpxPoint> points;
        std::string error;
        const std::string path = MAPCORE_DEMO_DATA "/tunnel-drive.gpx";
        if (!readTrack(path, points, error)) {
            demo::say("cannot run: %s", error.c_str());
            finished();
            return;
        }
        demo::say("track %s: %zu points; positioning server %s", path.c_str(), points.size(),
                  Startup::StartupData::getInstance()->getHost(Startup::StartupData::HOST_CELLID).c_str());
        scriptTunnelRadios();
        queriesBefore = demo::server().journal().positionings.size();
        player.reset(new Simulator::GpxPlayer(points, kReplayRate));
        manager = LocationManager::getInstance();
        manager->addLocationListener(this);
        manager->setSimulator(player.get());
        demo::say("replaying at %.0fx as simulated satellite fixes", kReplayRate);
        player->start(Simulator::GpxPlayer::Finished::make<LocationScene, &LocationScene::onTrackEnd>(this));
    }

    void onLocationChanged(LocationManager*, const Location::Location& location) override {
        ++positions;
        reportHandover(location);
        demo::addCount(std::string(precisionName(location.precision)) + " fixes delivered");
        if (location.precision != lastPrecision) {
            demo::say("  ---- positions now from %s ----", precisionName(location.precision));
            lastPrecision = location.precision;
        }
        demo::say("  %-9s %.6f, %.6f  +-%3.0f m  %5.1f m/s  course %5.1f", precisionName(location.precision),
                  location.latitude, location.longitude, location.accuracy, location.speed, location.bearing);
    }

    void onLocationPrecisionChanged(LocationManager*, Location::LocationPrecision oldPrecision,
                                    Location::LocationPrecision newPrecision) override {
        demo::say("  handover: overall precision %s -> %s", precisionName(oldPrecision),
                  precisionName(newPrecision));
    }

private:
    static bool readTrack(const std::string& path, std::vector<Simulator::GpxPoint>& points,
                          std::string& error) {
        std::unique_ptr<FILE, int (*)(FILE*)> file(std::fopen(path.c_str(), "rb"), &std::fclose);
        if (!file) {
            error = "cannot open " + path;
            return false;
        }
        std::vector<unsigned char> bytes;
        unsigned char buffer[4096];
        size_t count = 0;
        while ((count = std::fread(buffer, 1, sizeof(buffer), file.get())) > 0) {
            bytes.insert(bytes.end(), buffer, buffer + count);
        }
        return Simulator::GpxReader::parse(bytes, points, error);
    }

    // Times on the replay clock and, multiplied by the replay rate, in the
    // drive's own seconds.
    static void sayHandover(const char* what, KDust from, KDust to) {
        const double seconds = static_cast<double>(to - from) / 1.0e9;
        demo::say("  handover %s took %.2f s (%.1f s of the drive)", what, seconds, seconds * kReplayRate);
    }

    // A satellite-level record is a satellite fix; the chain gives the first
    // fix after a jump network level until it has a course, so the source is
    // told by the overall precision as well.
    void reportHandover(const Location::Location& location) {
        const KDust now = kdGetTimeUST();
        const bool satellite = manager->getPrecision() == Location::PrecisionSatellite;
        if (satellite) {
            if (firstNetworkPositionAt != 0) {
                sayHandover("network -> satellite", firstNetworkPositionAt, now);
                firstNetworkPositionAt = 0;
            }
            lastSatelliteFixAt = now;
        } else if (location.precision == Location::PrecisionNetwork && firstNetworkPositionAt == 0) {
            firstNetworkPositionAt = now;
            if (lastSatelliteFixAt != 0) {
                sayHandover("satellite -> network", lastSatelliteFixAt, now);
            }
        }
    }

    // What the radios see in the tunnel; the server knows these.
    static void scriptTunnelRadios() {
        pal::scriptWifiScan(
            pal::Answer::after(50 * 1000000ull),
            {{"00:1a:2b:3c:4d:5e", "tunnel-cafe", -71}, {"00:1a:2b:3c:4d:5f", "tunnel-guest", -80}});
        pal::scriptCellInfo(pal::Answer::after(20 * 1000000ull), {true, 23011, 4021, "26201", "262"});
        pal::scriptSignalStrength(pal::Answer::after(10 * 1000000ull), true, -85);
    }

    void onTrackEnd() {
        // The last fix is still on its way through the event loop.
        finishTimer.start(Util::Timer::OneShot, 100 * 1000000ll);
    }

    void finish() {
        demo::say("track replayed: %d positions reached the application", positions);
        const DevServer::Journal journal = demo::server().journal();
        for (size_t i = queriesBefore; i < journal.positionings.size(); ++i) {
            const DevServer::PositioningRecord& query = journal.positionings[i];
            demo::say("  the server was asked with %zu radios in the tunnel and answered %s",
                      query.radios.size(), query.found ? "a position" : query.error.c_str());
        }
        detach();
        finished();
    }

    void detach() {
        if (manager != nullptr) {
            manager->setSimulator(nullptr);
            manager->removeLocationListener(this);
            manager = nullptr;
        }
        if (player) {
            player->stop();
        }
    }

    std::unique_ptr<Simulator::GpxPlayer> player;
    LocationManager* manager;
    int positions;
    size_t queriesBefore;
    int lastPrecision;
    KDust lastSatelliteFixAt;
    KDust firstNetworkPositionAt;
    Util::Timer finishTimer;
    Done finished;
};

DemoSceneRegistration<LocationScene> registration("Location", 60);

}  // namespace
