// Location: a short drive replayed from a GPX file (examples/demo/data,
// written by make_tunnel_drive.py) as simulated satellite fixes, fifteen times
// faster than driven. In the tunnel the receiver loses its fix; the location
// manager hands over to network positioning, which asks a positioning server
// on loopback with the simulated Wi-Fi and cell; out of the tunnel the
// satellite fixes take over again. Every handover and every filtered position
// the application would see is printed.
#include <httplib.h>
#include <pal/Simulation.h>

#include <cstdio>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "DemoScene.h"
#include "location/LocationManager.h"
#include "location/simulator/GpxPlayer.h"
#include "location/simulator/GpxReader.h"
#include "startup/StartupData.h"
#include "util/Timer.h"

namespace {

using Location::LocationManager;

const float kReplayRate = 15.0f;
// Where the server places the phone from its cell and Wi-Fi: in the tunnel.
const char kPositionAnswer[] =
    "<location><coordinates latitude=\"48.13505\" longitude=\"11.58660\" accuracy=\"120\"/></location>";

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

// Main thread; the server answers on its own thread.
class LocationScene : public DemoScene, public Location::LocationListener {
public:
    LocationScene()
        : port(0),
          manager(nullptr),
          positions(0),
          lastPrecision(-1),
          finishTimer(callback<void (*)()>::make<LocationScene, &LocationScene::finish>(this)) {}

    ~LocationScene() override {
        detach();
        if (serverThread.joinable()) {
            server.stop();
            serverThread.join();
        }
    }

    void run(Done done) override {
        finished = done;
        std::vector<Simulator::GpxPoint> points;
        std::string error;
        const std::string path = MAPCORE_DEMO_DATA "/tunnel-drive.gpx";
        if (!startServer() || !readTrack(path, points, error)) {
            demo::say("cannot run: %s", port <= 0 ? "no loopback port" : error.c_str());
            finished();
            return;
        }
        demo::say("positioning server on 127.0.0.1:%d; track %s: %zu points", port, path.c_str(),
                  points.size());
        configureDevice();
        player.reset(new Simulator::GpxPlayer(points, kReplayRate));
        manager = LocationManager::getInstance();
        manager->addLocationListener(this);
        manager->setSimulator(player.get());
        demo::say("replaying at %.0fx as simulated satellite fixes", kReplayRate);
        player->start(Simulator::GpxPlayer::Finished::make<LocationScene, &LocationScene::onTrackEnd>(this));
    }

    void onLocationChanged(LocationManager*, const Location::Location& location) override {
        ++positions;
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
    bool startServer() {
        server.Get("/cellid_location/", [](const httplib::Request& request, httplib::Response& response) {
            demo::say("  server: positioning request with %zu parameters (wifinetworks=%s)",
                      request.params.size(), request.get_param_value("wifinetworks").c_str());
            response.set_content(kPositionAnswer, "text/xml");
        });
        port = server.bind_to_any_port("127.0.0.1");
        if (port > 0) {
            serverThread = std::thread([this] { server.listen_after_bind(); });
        }
        return port > 0;
    }

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

    // What the startup answer and the radios would give on a device.
    void configureDevice() {
        Startup::StartupData* startup = Startup::StartupData::getInstance();
        startup->setHost(Startup::StartupData::HOST_CELLID, "http://127.0.0.1:" + std::to_string(port) + "/");
        startup->uuid = "demo-client";
        startup->startupReady = true;
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

    httplib::Server server;
    int port;
    std::thread serverThread;
    std::unique_ptr<Simulator::GpxPlayer> player;
    LocationManager* manager;
    int positions;
    int lastPrecision;
    Util::Timer finishTimer;
    Done finished;
};

DemoSceneRegistration<LocationScene> registration("Location", 60);

}  // namespace
