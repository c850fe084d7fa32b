#include "location/LocationFilterGenerateSpeed.h"

#include "math/CoordConversion.h"

namespace Location {

namespace {

const size_t kWindowSize = 5;

}  // namespace

LocationFilterGenerateSpeed::LocationFilterGenerateSpeed() : lastSpeed(0.0f) {}

Location LocationFilterGenerateSpeed::filter(const Location& location) {
    window.push_back(location);
    while (window.size() > kWindowSize) {
        window.pop_front();
    }
    if (location.speed >= 0.0f) {
        return location;
    }
    Location result = location;
    if (window.size() == 1) {
        result.speed = 0.0f;
        result.speedXY = 0;
        return result;
    }
    const Location& oldest = window.front();
    const Location& newest = window.back();
    const float distance = CoordConversion::getDistance(oldest.x, oldest.y, newest.x, newest.y);
    // Signed, so that a clock stepping back keeps the last speed instead of
    // wrapping into an enormous interval.
    const KDint64 elapsedMs = static_cast<KDint64>(newest.time - oldest.time) / 1000000;
    if (elapsedMs > 0) {
        lastSpeed = distance / (static_cast<float>(elapsedMs) / 1000.0f);
    }
    result.speed = lastSpeed;
    CoordConversion::MtoXY(result.latitude, lastSpeed, result.speedXY);
    return result;
}

void LocationFilterGenerateSpeed::reset() {
    window.clear();
    lastSpeed = 0.0f;
}

}  // namespace Location
