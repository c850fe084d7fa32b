// Gesture timelines and sensor rhythms from arbitrary bytes through the
// proximity gesture recognizer: what is not a gesture is refused, scores stay
// in their range, and at most ten periods are kept.
//
// Input: gesture timelines separated by '|', up to the first zero byte; then
// one sensor change per byte, bit 0 the new state (covered when set) and the
// other bits the time since the change before, in steps of 10 ms.
#include <cstddef>
#include <cstdint>
#include <string>

#include "FuzzSupport.h"
#include "sensor/proximity/ProximityGestureRecognizer.h"

namespace {

const KDust kStepNs = 10 * 1000000ull;

bool isScore(float score) {
    return score == -1.0f || (score >= 0.0f && score <= 1.0f);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const uint8_t* end = data + size;
    const uint8_t* separator = data;
    while (separator != end && *separator != 0) {
        ++separator;
    }
    const std::string text(reinterpret_cast<const char*>(data), static_cast<size_t>(separator - data));

    Sensor::ProximityGestureRecognizer recognizer;
    size_t begin = 0;
    while (begin <= text.size()) {
        size_t bar = text.find('|', begin);
        if (bar == std::string::npos) {
            bar = text.size();
        }
        const std::string timeline = text.substr(begin, bar - begin);
        const bool added = recognizer.addGesture(timeline, timeline);
        fuzz::check(!added || Sensor::ProximityGesture::isValidTimeline(timeline), "only valid timelines are added");
        begin = bar + 1;
    }

    const uint8_t* change = separator == end ? end : separator + 1;
    for (; change != end; ++change) {
        pal::advanceTime((*change >> 1) * kStepNs);
        recognizer.onSensorEvent((*change & 1) != 0);
        fuzz::check(recognizer.getPeriods().size() <= 10, "at most ten periods are kept");
        const Sensor::ProximityGesture observed("observed", recognizer.getPeriods(), (*change & 1) == 0);
        const float score = observed.compare(recognizer.getPeriods(), (*change & 1) == 0);
        fuzz::check(isScore(score), "scores are -1 or within [0, 1]");
    }
    return 0;
}
