// mapcore-devserver: the startup, positioning and Wi-Fi pool servers of a
// deployment, played on 127.0.0.1 for developing and testing an application.
#include <pthread.h>
#include <signal.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "devserver/Server.h"
#include "devserver/Text.h"

namespace {

const char kUsage[] =
    "usage: mapcore-devserver [--port N] [--data DIR] [--config FILE] [--help]\n"
    "\n"
    "Serves on http://127.0.0.1:N/ (default 8080; 0 picks a free port):\n"
    "  /startup            the startup document: a uuid for new clients, every host\n"
    "                      pointing back here, the network_scanner feature\n"
    "  /cellid_location/   positions from the config's Wi-Fi and cell table\n"
    "  /wifipool/2.x/      Wi-Fi pool uploads, decoded, checked and stored in DIR\n"
    "  /                   a status page of what the server received\n"
    "\n"
    "  --data DIR     where uploads are stored (upload-NNNNNN.xml and index.tsv);\n"
    "                 default: kept in memory only\n"
    "  --config FILE  settings and radio table, \"name = value\" lines:\n"
    "                   uuid_prefix, device_id, network_scanner (0/1), scan_timeout,\n"
    "                   send_timeout (seconds), host.TYPE = URL, max_body_bytes,\n"
    "                   max_document_bytes, journal_limit, quiet (0/1),\n"
    "                   wifi = BSSID LAT LON RANGE, cell = MCC MNC LAC CID LAT LON RANGE\n"
    "                 without it, the demo's radios are known\n"
    "\n"
    "Stops on Ctrl-C.\n";

struct Options {
    int port = 8080;
    std::string data;
    std::string config;
};

int fail(const std::string& message) {
    std::fprintf(stderr, "mapcore-devserver: %s\n%s", message.c_str(), kUsage);
    return 2;
}

// 0 to go on, else the exit code.
int parse(int argc, char** argv, Options& options, std::string& error) {
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        if (arg == "--help" || arg == "-h") {
            std::fputs(kUsage, stdout);
            return -1;
        }
        if (arg != "--port" && arg != "--data" && arg != "--config") {
            error = "unknown option " + arg;
            return 2;
        }
        if (i + 1 >= argc) {
            error = arg + " needs a value";
            return 2;
        }
        const std::string value = argv[++i];
        long long port = 0;
        if (arg == "--port") {
            if (!DevServer::Text::parseInteger(value, 0, 65535, port)) {
                error = "--port needs a number from 0 to 65535, not \"" + value + "\"";
                return 2;
            }
            options.port = static_cast<int>(port);
        } else {
            (arg == "--data" ? options.data : options.config) = value;
        }
    }
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    std::string error;
    const int parsed = parse(argc, argv, options, error);
    if (parsed == -1) {
        return 0;
    }
    if (parsed != 0) {
        return fail(error);
    }
    DevServer::Config config = DevServer::Config::defaults();
    if (!options.config.empty() && !DevServer::Config::load(options.config, config, error)) {
        std::fprintf(stderr, "mapcore-devserver: %s\n", error.c_str());
        return 2;
    }
    // Blocked before the server's threads start, so that they inherit the
    // mask and the signal waits for this thread.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGINT);
    sigaddset(&stopSignals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    DevServer::Server server(config, options.data);
    if (!server.start(options.port)) {
        std::fprintf(stderr, "mapcore-devserver: cannot listen on 127.0.0.1:%d\n", options.port);
        return 1;
    }
    std::printf("mapcore-devserver: serving on %s (%zu access points, %zu cells known; uploads %s)\n",
                server.baseUrl().c_str(), config.accessPoints.size(), config.cells.size(),
                options.data.empty() ? "in memory" : ("in " + options.data).c_str());
    std::fflush(stdout);

    int signal = 0;
    sigwait(&stopSignals, &signal);
    server.stop();
    std::printf("mapcore-devserver: stopped\n");
    return 0;
}
