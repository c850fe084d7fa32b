#include "devserver/Config.h"

#include <cctype>
#include <fstream>
#include <sstream>

#include "devserver/Text.h"

namespace DevServer {

namespace {

const long long kMaxSeconds = 24 * 3600;
const long long kMaxBytes = 1ll << 34;

// Twelve hexadecimal digits with or without ':' or '-' between them, lower-cased; empty
// when the text is no BSSID.
std::string normalizeBssid(const std::string& text) {
    std::string digits;
    for (char c : text) {
        if (c == ':' || c == '-') {
            continue;
        }
        if (!std::isxdigit(static_cast<unsigned char>(c))) {
            return std::string();
        }
        digits += static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    return digits.size() == 12 ? digits : std::string();
}

std::vector<std::string> words(const std::string& text) {
    std::istringstream in(text);
    std::vector<std::string> out;
    std::string word;
    while (in >> word) {
        out.push_back(word);
    }
    return out;
}

// Reads one file into a Config; every method returns an error text or "".
class ConfigReader {
public:
    explicit ConfigReader(Config& config) : config(config), radiosSeen(false) {}

    std::string line(const std::string& text) {
        const std::string trimmed = Text::trim(text);
        if (trimmed.empty() || trimmed[0] == '#') {
            return std::string();
        }
        const std::size_t equals = trimmed.find('=');
        if (equals == std::string::npos) {
            return "expected \"name = value\"";
        }
        const std::string name = Text::trim(trimmed.substr(0, equals));
        const std::string value = Text::trim(trimmed.substr(equals + 1));
        if (name == "wifi" || name == "cell") {
            if (!radiosSeen) {
                radiosSeen = true;
                config.accessPoints.clear();
                config.cells.clear();
            }
            return name == "wifi" ? wifi(value) : cell(value);
        }
        return setting(name, value);
    }

private:
    std::string setting(const std::string& name, const std::string& value) {
        if (name == "uuid_prefix") {
            return text(value, config.uuidPrefix);
        }
        if (name == "device_id") {
            return text(value, config.deviceId);
        }
        if (name == "network_scanner" || name == "quiet") {
            return flag(value, name == "quiet" ? config.quiet : config.networkScanner);
        }
        if (name == "scan_timeout" || name == "send_timeout") {
            long long seconds = 0;
            if (!Text::parseInteger(value, 1, kMaxSeconds, seconds)) {
                return name + " must be a whole number of seconds from 1 to " + std::to_string(kMaxSeconds);
            }
            (name == "scan_timeout" ? config.scanTimeout : config.sendTimeout) = static_cast<int>(seconds);
            return std::string();
        }
        if (name == "max_body_bytes" || name == "max_document_bytes" || name == "journal_limit") {
            long long count = 0;
            if (!Text::parseInteger(value, 1, kMaxBytes, count)) {
                return name + " must be a whole number from 1 to " + std::to_string(kMaxBytes);
            }
            std::size_t& target = name == "max_body_bytes"       ? config.maxBodyBytes
                                  : name == "max_document_bytes" ? config.maxDocumentBytes
                                                                 : config.journalLimit;
            target = static_cast<std::size_t>(count);
            return std::string();
        }
        if (name.compare(0, 5, "host.") == 0 && name.size() > 5) {
            if (value.compare(0, 7, "http://") != 0 && value.compare(0, 8, "https://") != 0) {
                return name + " must be an http:// or https:// URL";
            }
            config.hosts[name.substr(5)] = value;
            return std::string();
        }
        return "unknown setting \"" + Text::printable(name) + "\"";
    }

    static std::string text(const std::string& value, std::string& target) {
        for (unsigned char c : value) {
            if (c < 0x20) {
                return "control characters are not allowed";
            }
        }
        target = value;
        return std::string();
    }

    static std::string flag(const std::string& value, bool& target) {
        if (value != "0" && value != "1") {
            return "expected 0 or 1, got \"" + Text::printable(value) + "\"";
        }
        target = value == "1";
        return std::string();
    }

    static std::string position(const std::string& latitude, const std::string& longitude,
                                const std::string& range, double& lat, double& lon, double& metres) {
        if (!Text::parseDouble(latitude, lat) || lat < -90 || lat > 90) {
            return "latitude \"" + Text::printable(latitude) + "\" is not a number from -90 to 90";
        }
        if (!Text::parseDouble(longitude, lon) || lon < -180 || lon > 180) {
            return "longitude \"" + Text::printable(longitude) + "\" is not a number from -180 to 180";
        }
        if (!Text::parseDouble(range, metres) || metres <= 0) {
            return "range \"" + Text::printable(range) + "\" is not a positive number of metres";
        }
        return std::string();
    }

    std::string wifi(const std::string& value) {
        const std::vector<std::string> fields = words(value);
        if (fields.size() != 4) {
            return "expected \"wifi = BSSID LATITUDE LONGITUDE RANGE\"";
        }
        AccessPoint point;
        point.bssid = normalizeBssid(fields[0]);
        if (point.bssid.empty()) {
            return "\"" + Text::printable(fields[0]) + "\" is not a BSSID of twelve hexadecimal digits";
        }
        for (const AccessPoint& known : config.accessPoints) {
            if (known.bssid == point.bssid) {
                return "access point " + fields[0] + " is listed twice";
            }
        }
        const std::string wrong =
            position(fields[1], fields[2], fields[3], point.latitude, point.longitude, point.range);
        if (wrong.empty()) {
            config.accessPoints.push_back(point);
        }
        return wrong;
    }

    std::string cell(const std::string& value) {
        const std::vector<std::string> fields = words(value);
        if (fields.size() != 7) {
            return "expected \"cell = MCC MNC LAC CID LATITUDE LONGITUDE RANGE\"";
        }
        long long numbers[4] = {0, 0, 0, 0};
        const char* names[4] = {"MCC", "MNC", "LAC", "CID"};
        const long long limits[4] = {999, 999, 0xFFFFFFFFll, 0xFFFFFFFFll};
        for (int i = 0; i < 4; ++i) {
            if (!Text::parseInteger(fields[i], 0, limits[i], numbers[i])) {
                return std::string(names[i]) + " \"" + Text::printable(fields[i]) +
                       "\" is not a whole number from 0 to " + std::to_string(limits[i]);
            }
        }
        Cell cell;
        cell.mcc = static_cast<int>(numbers[0]);
        cell.mnc = static_cast<int>(numbers[1]);
        cell.lac = static_cast<unsigned long>(numbers[2]);
        cell.cid = static_cast<unsigned long>(numbers[3]);
        for (const Cell& known : config.cells) {
            if (known.mcc == cell.mcc && known.mnc == cell.mnc && known.lac == cell.lac &&
                known.cid == cell.cid) {
                return "cell " + fields[0] + " " + fields[1] + " " + fields[2] + " " + fields[3] +
                       " is listed twice";
            }
        }
        const std::string wrong =
            position(fields[4], fields[5], fields[6], cell.latitude, cell.longitude, cell.range);
        if (wrong.empty()) {
            config.cells.push_back(cell);
        }
        return wrong;
    }

    Config& config;
    bool radiosSeen;
};

AccessPoint accessPoint(const char* bssid, double latitude, double longitude, double range) {
    AccessPoint point;
    point.bssid = bssid;
    point.latitude = latitude;
    point.longitude = longitude;
    point.range = range;
    return point;
}

Cell cell(int mcc, int mnc, unsigned long lac, unsigned long cid, double latitude, double longitude,
          double range) {
    Cell cell;
    cell.mcc = mcc;
    cell.mnc = mnc;
    cell.lac = lac;
    cell.cid = cid;
    cell.latitude = latitude;
    cell.longitude = longitude;
    cell.range = range;
    return cell;
}

}  // namespace

Config Config::defaults() {
    Config config;
    // The two access points and the cell the demo's drive sees in the Munich
    // tunnel, and the cell and access points of its statistics scene.
    config.accessPoints = {
        accessPoint("001a2b3c4d5e", 48.13520, 11.58630, 50),
        accessPoint("001a2b3c4d5f", 48.13490, 11.58690, 60),
    };
    config.cells = {
        cell(262, 1, 4021, 23011, 48.13510, 11.58660, 1500),
        cell(250, 1, 7713, 20961, 55.75580, 37.61730, 2000),
    };
    return config;
}

bool Config::load(const std::string& path, Config& config, std::string& error) {
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        error = path + ": cannot read the file";
        return false;
    }
    std::ostringstream text;
    text << in.rdbuf();
    if (in.bad()) {
        error = path + ": cannot read the file";
        return false;
    }
    return parse(text.str(), path, config, error);
}

bool Config::parse(const std::string& text, const std::string& name, Config& config, std::string& error) {
    Config read = config;
    ConfigReader reader(read);
    std::istringstream in(text);
    std::string line;
    for (int number = 1; std::getline(in, line); ++number) {
        const std::string wrong = reader.line(line);
        if (!wrong.empty()) {
            error = name + ":" + std::to_string(number) + ": " + wrong;
            return false;
        }
    }
    config = read;
    return true;
}

}  // namespace DevServer
