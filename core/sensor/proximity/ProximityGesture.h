#pragma once

#include <boost/shared_ptr.hpp>
#include <list>
#include <string>

namespace Sensor {

// A rhythm of covering and uncovering the proximity sensor, written as a
// string of '*' (covered) and '-' (uncovered), one character per 150 ms, and
// kept as the lengths of its periods in milliseconds, oldest first.
// Immutable once made; any thread.
class ProximityGesture {
public:
    static constexpr char uncoveredChar = '-';
    static constexpr char coveredChar = '*';
    // Milliseconds per character.
    static constexpr int slice = 150;
    // Allowed relative deviation of an observed period.
    static constexpr float tolerance = 0.5f;
    // The period before a gesture must be longer than this many slices.
    static constexpr int pauseFactor = 10;

    // A timeline that is empty or holds other characters than '*' and '-' is
    // an assertion and gives a gesture that matches nothing.
    ProximityGesture(const std::string& name, const std::string& aTimeline);
    // An empty timeline is an assertion and gives a gesture that matches
    // nothing.
    ProximityGesture(const std::string& name, const std::list<int>& timeline, bool endsCovered);

    // Non-empty and made of '*' and '-' only.
    static bool isValidTimeline(const std::string& timeline);
    // At least one period, each longer than zero.
    bool isValid() const;

    const std::string& getName() const { return name; }
    const std::list<int>& getTimeline() const { return timeline; }
    bool getEndsCovered() const { return endsCovered; }
    size_t getLength() const { return timeline.size(); }

    // How well the most recent observed periods (oldest first) match: -1 when
    // they do not, 0 when they do but without a pause before them, else the
    // mean score of the periods in (0, 1].
    float compare(const std::list<int>& observed, bool lastCovered) const;
    // This gesture against the other's timeline as if observed; -1 for
    // gestures of different lengths unless anyLength.
    float compare(const boost::shared_ptr<ProximityGesture>& other, bool anyLength) const;
    // Whether the other gesture, performed, could be taken for this one: it
    // ends like this one, or it could be the beginning of this one.
    bool isCollisionPossible(const boost::shared_ptr<ProximityGesture>& other) const;

private:
    static std::list<int> compile(const std::string& timeline);

    const std::string name;
    const std::list<int> timeline;
    const bool endsCovered;
};

}  // namespace Sensor
