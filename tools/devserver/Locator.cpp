#include "devserver/Locator.h"

#include <cctype>
#include <cmath>
#include <sstream>

#include "devserver/Text.h"

namespace DevServer {

namespace {

const double kDegrees = 180.0 / M_PI;
const int kMinSignal = -200;
const int kMaxSignal = 200;

std::string lowerCase(const std::string& text) {
    std::string lower;
    for (char c : text) {
        lower += static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    return lower;
}

std::string cellName(long long mcc, long long mnc, long long lac, long long cid) {
    return std::to_string(mcc) + "/" + std::to_string(mnc) + "/" + std::to_string(lac) + "/" +
           std::to_string(cid);
}

std::string parameter(const std::map<std::string, std::string>& params, const char* name) {
    const auto it = params.find(name);
    return it != params.end() ? it->second : std::string();
}

// Means of positions on the sphere as unit vectors, so that radios on both
// sides of the antimeridian or near a pole average to a point between them.
class WeightedMean {
public:
    void add(double latitude, double longitude, double range, double weight) {
        const double lat = latitude / kDegrees;
        const double lon = longitude / kDegrees;
        x += weight * std::cos(lat) * std::cos(lon);
        y += weight * std::cos(lat) * std::sin(lon);
        z += weight * std::sin(lat);
        ranges += weight * range;
        weights += weight;
    }

    bool empty() const { return weights <= 0; }

    void writeTo(PositioningRecord& record) const {
        record.found = true;
        record.latitude = std::atan2(z, std::sqrt(x * x + y * y)) * kDegrees;
        record.longitude = std::atan2(y, x) * kDegrees;
        record.accuracy = ranges / weights;
    }

private:
    double x = 0;
    double y = 0;
    double z = 0;
    double ranges = 0;
    double weights = 0;
};

}  // namespace

Locator::Locator(const Config& config) : config(config) {}

bool Locator::locate(const std::map<std::string, std::string>& params, PositioningRecord& record,
                     std::string& error) const {
    record.radios.clear();
    record.found = false;
    if (!addWifi(parameter(params, "wifinetworks"), record, error) || !addCell(params, record, error)) {
        return false;
    }
    WeightedMean wifi;
    for (const SeenRadio& radio : record.radios) {
        for (const AccessPoint& point : config.accessPoints) {
            if (radio.kind == "wifi" && radio.id == point.bssid) {
                wifi.add(point.latitude, point.longitude, point.range, std::pow(10.0, radio.signal / 20.0));
            }
        }
    }
    if (!wifi.empty()) {
        wifi.writeTo(record);
        return true;
    }
    for (const SeenRadio& radio : record.radios) {
        for (const Cell& cell : config.cells) {
            if (radio.kind == "cell" && radio.known &&
                radio.id == cellName(cell.mcc, cell.mnc, cell.lac, cell.cid)) {
                record.found = true;
                record.latitude = cell.latitude;
                record.longitude = cell.longitude;
                record.accuracy = cell.range;
                return true;
            }
        }
    }
    record.errorCode = kUnknownRadios;
    record.error = record.radios.empty() ? "no radios in the query" : "none of the radios is known";
    return true;
}

// "BSSID:LEVEL,BSSID:LEVEL...", the BSSIDs without separators.
bool Locator::addWifi(const std::string& list, PositioningRecord& record, std::string& error) const {
    if (list.empty()) {
        return true;
    }
    std::istringstream in(list);
    std::string entry;
    while (std::getline(in, entry, ',')) {
        const std::size_t colon = entry.rfind(':');
        long long level = 0;
        if (colon == std::string::npos ||
            !Text::parseInteger(entry.substr(colon + 1), kMinSignal, kMaxSignal, level)) {
            error = "wifinetworks entry \"" + Text::printable(entry) + "\" is not BSSID:LEVEL";
            return false;
        }
        SeenRadio radio;
        radio.kind = "wifi";
        radio.id = lowerCase(entry.substr(0, colon));
        radio.signal = static_cast<int>(level);
        for (const AccessPoint& point : config.accessPoints) {
            radio.known = radio.known || point.bssid == radio.id;
        }
        record.radios.push_back(radio);
    }
    if (list.back() == ',') {
        error = "wifinetworks ends with an empty entry";
        return false;
    }
    return true;
}

// The serving cell, named by cellid and lac; its operator (mobile country and
// network code) comes as operatorid, either "MCCMNC" or the MNC alone, with
// countrycode the MCC.
bool Locator::addCell(const std::map<std::string, std::string>& params, PositioningRecord& record,
                      std::string& error) const {
    if (params.count("cellid") == 0 && params.count("lac") == 0) {
        return true;
    }
    long long cid = 0;
    long long lac = 0;
    if (!Text::parseInteger(parameter(params, "cellid"), 0, 0xFFFFFFFFll, cid) ||
        !Text::parseInteger(parameter(params, "lac"), 0, 0xFFFFFFFFll, lac)) {
        error = "cellid and lac must both be unsigned 32-bit numbers";
        return false;
    }
    long long signal = 0;
    const std::string strength = parameter(params, "signalstrength");
    if (!strength.empty() && !Text::parseInteger(strength, kMinSignal, kMaxSignal, signal)) {
        error = "signalstrength \"" + Text::printable(strength) + "\" is not a number";
        return false;
    }
    std::string country = parameter(params, "countrycode");
    std::string network = parameter(params, "operatorid");
    if (country.empty() && network.size() > 3) {
        country = network.substr(0, 3);
    }
    if (network.size() > country.size() && network.compare(0, country.size(), country) == 0) {
        network = network.substr(country.size());
    }
    long long mcc = 0;
    long long mnc = 0;
    SeenRadio radio;
    radio.kind = "cell";
    radio.signal = static_cast<int>(signal);
    const bool numeric = Text::parseInteger(country, 0, 999, mcc) && Text::parseInteger(network, 0, 999, mnc);
    radio.id = numeric ? cellName(mcc, mnc, lac, cid)
                       : Text::printable(country) + "/" + Text::printable(network) + "/" +
                             std::to_string(lac) + "/" + std::to_string(cid);
    for (const Cell& cell : config.cells) {
        radio.known =
            radio.known || (numeric && radio.id == cellName(cell.mcc, cell.mnc, cell.lac, cell.cid));
    }
    record.radios.push_back(radio);
    return true;
}

}  // namespace DevServer
