#include "sensor/proximity/ProximityGesture.h"

#include <KD/kd.h>

#include <cstdlib>
#include <iterator>

namespace Sensor {

ProximityGesture::ProximityGesture(const std::string& name, const std::string& aTimeline)
    : name(name), timeline(compile(aTimeline)), endsCovered(!aTimeline.empty() && aTimeline.back() == coveredChar) {
    KD_ASSERT(aTimeline.size() > 0);
    KD_ASSERT(aTimeline.empty() || isValidTimeline(aTimeline));
}

ProximityGesture::ProximityGesture(const std::string& name, const std::list<int>& timeline, bool endsCovered)
    : name(name), timeline(timeline), endsCovered(endsCovered) {
    KD_ASSERT(timeline.size() > 0);
}

bool ProximityGesture::isValidTimeline(const std::string& timeline) {
    if (timeline.empty()) {
        return false;
    }
    for (char character : timeline) {
        if (character != coveredChar && character != uncoveredChar) {
            return false;
        }
    }
    return true;
}

// Empty for an invalid string, so that the gesture matches nothing.
std::list<int> ProximityGesture::compile(const std::string& timeline) {
    std::list<int> periods;
    if (!isValidTimeline(timeline)) {
        return periods;
    }
    char current = timeline[0];
    int run = 0;
    for (char character : timeline) {
        if (character != current) {
            periods.push_back(run * slice);
            current = character;
            run = 0;
        }
        ++run;
    }
    periods.push_back(run * slice);
    return periods;
}

bool ProximityGesture::isValid() const {
    if (timeline.empty()) {
        return false;
    }
    for (int period : timeline) {
        if (period <= 0) {
            return false;
        }
    }
    return true;
}

float ProximityGesture::compare(const std::list<int>& observed, bool lastCovered) const {
    if (!isValid() || endsCovered != lastCovered || timeline.size() > observed.size()) {
        return -1.0f;
    }
    std::list<int>::const_iterator paired = observed.begin();
    std::advance(paired, observed.size() - timeline.size());
    const std::list<int>::const_iterator firstPaired = paired;
    float sum = 0.0f;
    for (int period : timeline) {
        const float deviation = static_cast<float>(std::abs(static_cast<long long>(*paired) - period));
        const float score = 1.0f - deviation / (period * tolerance);
        if (score <= 0.0f) {
            return -1.0f;
        }
        sum += score;
        ++paired;
    }
    if (firstPaired != observed.begin() && *std::prev(firstPaired) <= pauseFactor * slice) {
        return 0.0f;
    }
    return sum / static_cast<float>(timeline.size());
}

float ProximityGesture::compare(const boost::shared_ptr<ProximityGesture>& other, bool anyLength) const {
    if (!other || (!anyLength && other->getLength() != getLength())) {
        return -1.0f;
    }
    return compare(other->timeline, other->endsCovered);
}

bool ProximityGesture::isCollisionPossible(const boost::shared_ptr<ProximityGesture>& other) const {
    if (!other || !isValid() || !other->isValid()) {
        return false;
    }
    if (compare(other, true) > 0.0f) {
        return true;
    }
    if (getLength() <= other->getLength()) {
        return false;
    }
    // Is the other a possible beginning of this one? Only if every pair of
    // periods, each widened by its gesture's tolerance, overlaps.
    std::list<int>::const_iterator mine = timeline.begin();
    for (int theirs : other->timeline) {
        const float a = static_cast<float>(*mine);
        const float b = static_cast<float>(theirs);
        if (a * (1.0f + tolerance) <= b * (1.0f - tolerance) || a * (1.0f - tolerance) >= b * (1.0f + tolerance)) {
            return false;
        }
        ++mine;
    }
    return true;
}

}  // namespace Sensor
