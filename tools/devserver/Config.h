#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace DevServer {

// A Wi-Fi access point the positioning endpoint knows.
struct AccessPoint {
    // Twelve lower-case hexadecimal digits, without separators.
    std::string bssid;
    double latitude = 0;
    double longitude = 0;
    // How far from its position the access point is heard, in metres.
    double range = 0;
};

// A mobile network cell the positioning endpoint knows.
struct Cell {
    int mcc = 0;
    int mnc = 0;
    unsigned long lac = 0;
    unsigned long cid = 0;
    double latitude = 0;
    double longitude = 0;
    double range = 0;
};

// What the development server answers and how much it accepts. A plain value;
// copied into the server when it is made.
//
// The config file is line-oriented text, "name = value" per line, '#' starts a
// comment line:
//   uuid_prefix = demo-            new clients get demo-1, demo-2 ... (default: random uuids)
//   device_id = phone-7            answered as deviceid (default: none)
//   network_scanner = 1            the statistics collector's switch (0 or 1)
//   scan_timeout = 2               its chunk period in seconds
//   send_timeout = 4               its upload period in seconds
//   host.tiles = http://host/      a host type answered with another URL (default: this server)
//   max_body_bytes = 1048576       larger request bodies are refused with 413
//   max_document_bytes = 16777216  larger decoded uploads are refused with 413
//   journal_limit = 1000           entries kept in memory for each kind of request
//   quiet = 0                      1: no summary line per upload on stdout
//   wifi = BSSID LAT LON RANGE     a known access point (BSSID with or without ':' or '-')
//   cell = MCC MNC LAC CID LAT LON RANGE
// Settings the file does not name keep their values; wifi and cell lines, when
// there is at least one, replace the whole radio table.
struct Config {
    std::vector<AccessPoint> accessPoints;
    std::vector<Cell> cells;

    // Startup answer.
    std::string uuidPrefix;
    std::string deviceId;
    bool networkScanner = true;
    int scanTimeout = 2;
    int sendTimeout = 4;
    // Host types answered with a URL other than the server's own.
    std::map<std::string, std::string> hosts;

    // Limits and output.
    std::size_t maxBodyBytes = 1024 * 1024;
    std::size_t maxDocumentBytes = 16 * 1024 * 1024;
    std::size_t journalLimit = 1000;
    bool quiet = false;

    // The settings above with a radio table of what the demo's simulated
    // radios see.
    static Config defaults();

    // Reads the file at path over config. On failure config is unchanged and
    // error reads "PATH:LINE: what is wrong" (or "PATH: ..." when the file
    // cannot be read).
    static bool load(const std::string& path, Config& config, std::string& error);

    // The same for text already read; name stands for the path in errors.
    static bool parse(const std::string& text, const std::string& name, Config& config, std::string& error);
};

}  // namespace DevServer
