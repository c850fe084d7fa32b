// Fixes of any values through the GPX recorder and back through the reader, under the "C" locale
// or (odd first byte) a decimal-comma one when installed. Each fix takes 26 bytes: six floats
// (latitude, longitude, speed, bearing, accuracy, altitude), a precision byte and a gap of up to
// 255 ms before it (small, so that the clock shared by all runs stays within four-digit years). Values
// outside what a receiver reports become the recorder's "none" or 0. Whatever the values, the reader takes
// the recorded track back point for point: the same floats, the same times, the defaults the reader gives to
// what was not written.
#include <clocale>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "location/simulator/GpxReader.h"
#include "location/simulator/GpxRecorder.h"

namespace {

const size_t kFixBytes = 26;
const size_t kMaxFixes = 64;

class Bytes {
public:
    explicit Bytes(const uint8_t* data) : data(data) {}

    float nextFloat() {
        float value;
        std::memcpy(&value, take(4), 4);
        return value;
    }
    uint8_t nextByte() { return *take(1); }

private:
    const uint8_t* take(size_t count) {
        const uint8_t* at = data + offset;
        offset += count;
        return at;
    }

    const uint8_t* data;
    size_t offset = 0;
};

float within(float value, float low, float high, float otherwise) {
    return std::isfinite(value) && value >= low && value <= high ? value : otherwise;
}

// What the reader gives back for a value the recorder wrote, or left out when negative.
float optionalRead(float recorded) {
    return recorded >= 0.0f ? recorded : -1.0f;
}

void checkPoint(const Simulator::GpxPoint& recorded, const Simulator::GpxPoint& read) {
    fuzz::check(read.latitude == recorded.latitude && read.longitude == recorded.longitude,
                "position comes back exactly");
    fuzz::check(read.altitude == recorded.altitude, "altitude comes back exactly");
    fuzz::check(read.speed == optionalRead(recorded.speed), "speed comes back exactly");
    const float course = recorded.course == 360.0f ? 0.0f : optionalRead(recorded.course);
    fuzz::check(read.course == course, "course comes back exactly");
    fuzz::check(read.accuracy == (recorded.accuracy >= 0.0f ? recorded.accuracy : 10.0f),
                "accuracy comes back exactly");
    fuzz::check(read.precision == recorded.precision, "precision comes back");
    fuzz::check(read.timeMs == recorded.timeMs, "time comes back to the millisecond");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    if (size < 1 + kFixBytes) {
        return 0;
    }
    const bool decimalComma = (data[0] & 1) != 0 && std::setlocale(LC_ALL, "de_DE.UTF-8") != nullptr;
    Bytes bytes(data + 1);
    Simulator::GpxRecorder recorder;
    for (size_t fix = 0; fix < (size - 1) / kFixBytes && fix < kMaxFixes; ++fix) {
        const float latitude = within(bytes.nextFloat(), -90.0f, 90.0f, 0.0f);
        const float longitude = within(bytes.nextFloat(), -180.0f, 180.0f, 0.0f);
        const float speed = within(bytes.nextFloat(), -1.0f, 1.0e4f, -1.0f);
        const float bearing = within(bytes.nextFloat(), -1.0f, 360.0f, -1.0f);
        const float accuracy = within(bytes.nextFloat(), -1.0f, 1.0e7f, -1.0f);
        const float altitude = within(bytes.nextFloat(), -1.0e6f, 1.0e6f, -1.0f);
        const int precision = 1 + (bytes.nextByte() & 1);
        pal::advanceTime(static_cast<KDust>(bytes.nextByte()) * 1000000ull);
        recorder.recordLocation(latitude, longitude, speed, bearing, accuracy, altitude, precision);
    }
    const std::string text = recorder.toGpx();
    const std::vector<unsigned char> file(text.begin(), text.end());
    std::vector<Simulator::GpxPoint> points;
    std::string error;
    const bool read = Simulator::GpxReader::parse(file, points, error);
    if (decimalComma) {
        std::setlocale(LC_ALL, "C");
    }
    fuzz::check(read, "the reader takes the recorded track");
    fuzz::check(points.size() == recorder.getPoints().size(), "every point comes back");
    for (size_t i = 0; i < points.size(); ++i) {
        checkPoint(recorder.getPoints()[i], points[i]);
    }
    return 0;
}
