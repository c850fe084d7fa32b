#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>

#include "location/LocationFilterAverage.h"
#include "location/LocationFilterAverageCourse.h"
#include "location/LocationFilterAveragePosition.h"
#include "location/LocationFilterGenerateCourse.h"
#include "location/LocationFilterGenerateSpeed.h"
#include "location/LocationFilterKalman.h"
#include "location/LocationFilterMinDistance.h"
#include "location/LocationTestSupport.h"
#include "support/PalTest.h"

namespace {

using location_test::fixNear;
using location_test::metresBetween;
typedef Location::Location Fix;

const float kLat = 52.52f;
const float kLon = 13.405f;
const KDust kSecond = 1000000000ull;

// Deterministic jitter within +-5 m.
float jitter(int i, int salt) {
    return static_cast<float>((i * 37 + salt * 11) % 11) - 5.0f;
}

// Gaussian noise from the fully specified Mersenne Twister (Box-Muller), so
// a seed gives the same track with every standard library.
class Noise {
public:
    explicit Noise(unsigned seed) : random(seed) {}
    float gauss(float sigma) {
        const double u1 = (static_cast<double>(random()) + 1.0) / 4294967296.0;
        const double u2 = static_cast<double>(random()) / 4294967296.0;
        return static_cast<float>(sigma * std::sqrt(-2.0 * std::log(u1)) * std::cos(6.283185307179586 * u2));
    }

private:
    std::mt19937 random;
};

// Metres north and east from (kLat, kLon) of a filtered position.
void offsetOf(const Location::Location& fix, float& north, float& east) {
    north = (fix.latitude - kLat) * location_test::kMetresPerDegreeLatitude;
    east = (fix.longitude - kLon) * location_test::kMetresPerDegreeLatitude * kdCosf(kLat * 0.017453292f);
}

// A receiver moving along `course` at `speed`: its true position and its
// fixes, noisy by `sigma` metres per axis, with speed and bearing noise.
struct NoisyTrack {
    std::vector<float> trueNorth, trueEast;
    std::vector<Location::Location> fixes;
};

NoisyTrack noisyStraightTrack(unsigned seed, int seconds, float speed, float course, float sigma,
                              float accuracy, float speedSigma, float bearingSigma) {
    Noise noise(seed);
    NoisyTrack track;
    const float radians = course * 0.017453292f;
    for (int i = 0; i < seconds; ++i) {
        const float north = speed * i * kdCosf(radians);
        const float east = speed * i * kdSinf(radians);
        const float reportedSpeed = std::max(0.0f, speed + noise.gauss(speedSigma));
        const float bearing = std::fmod(course + noise.gauss(bearingSigma) + 360.0f, 360.0f);
        Location::Location fix =
            location_test::fixNear(kLat, kLon, north + noise.gauss(sigma), east + noise.gauss(sigma),
                                   accuracy, (i + 1) * kSecond, reportedSpeed, bearing);
        fix.fixTime = 1000 * (i + 1);
        track.trueNorth.push_back(north);
        track.trueEast.push_back(east);
        track.fixes.push_back(fix);
    }
    return track;
}

float rmsError(const NoisyTrack& track, const std::vector<Location::Location>& shown) {
    float sum = 0.0f;
    for (size_t i = 0; i < shown.size(); ++i) {
        float north, east;
        offsetOf(shown[i], north, east);
        sum += (north - track.trueNorth[i]) * (north - track.trueNorth[i]) +
               (east - track.trueEast[i]) * (east - track.trueEast[i]);
    }
    return std::sqrt(sum / static_cast<float>(shown.size()));
}

// How far the shown position ever went back along `course` from one fix to
// the next.
float largestStepBack(const std::vector<Location::Location>& shown, float course) {
    const float radians = course * 0.017453292f;
    float largest = 0.0f;
    for (size_t i = 1; i < shown.size(); ++i) {
        float north0, east0, north1, east1;
        offsetOf(shown[i - 1], north0, east0);
        offsetOf(shown[i], north1, east1);
        const float along = (east1 - east0) * kdSinf(radians) + (north1 - north0) * kdCosf(radians);
        largest = std::max(largest, -along);
    }
    return largest;
}

class LocationFilterTest : public PalTest {
protected:
    Fix fix(float north, float east, int second, float speed = -1.0f, float bearing = -1.0f,
            float accuracy = 20.0f) {
        return fixNear(kLat, kLon, north, east, accuracy, second * kSecond, speed, bearing);
    }
};

TEST_F(LocationFilterTest, FirstFixPassesWithSpeedZeroAndNoCourseYet) {
    Location::LocationFilterAverage chain;
    const Fix first = fix(0, 0, 1);
    const Fix out = chain.filter(first);
    EXPECT_LT(metresBetween(first, out), 0.5f);
    EXPECT_EQ(0.0f, out.speed);
    EXPECT_EQ(-1.0f, out.bearing);
    // Without a course the fix leaves the chain at network level.
    EXPECT_EQ(Location::PrecisionNetwork, out.precision);
}

TEST_F(LocationFilterTest, StandingStillWithJitterKeepsTheFirstPosition) {
    Location::LocationFilterMinDistance minDistance;
    Location::LocationFilterAverage chain;
    const Fix first = fix(0, 0, 1);
    minDistance.filter(first);
    chain.filter(first);
    for (int i = 2; i < 40; ++i) {
        const Fix noisy = fix(jitter(i, 1), jitter(i, 2), i);
        const Fix held = minDistance.filter(noisy);
        EXPECT_EQ(first.latitude, held.latitude) << i;
        EXPECT_EQ(first.longitude, held.longitude) << i;
        EXPECT_EQ(first.x, held.x) << i;
        EXPECT_EQ(noisy.time, held.time) << i;
        const Fix smoothed = chain.filter(noisy);
        EXPECT_LT(metresBetween(first, smoothed), 0.5f) << i;
        EXPECT_LT(smoothed.speed, 0.01f) << i;
    }
}

TEST_F(LocationFilterTest, JumpOf83MetresOrMoreRestartsTheSmoothing) {
    for (float jump : {80.0f, 100.0f}) {
        Location::LocationFilterAverage chain;
        for (int i = 0; i < 4; ++i) {
            chain.filter(fix(12.0f * i, 0, i + 1));
        }
        const Fix far = fix(36.0f + jump, 0, 5);
        const Fix out = chain.filter(far);
        if (jump >= 83.0f) {
            // Nothing of the old track is averaged in.
            EXPECT_LT(metresBetween(far, out), 0.5f) << jump;
        } else {
            EXPECT_GT(metresBetween(far, out), 20.0f) << jump;
        }
    }
}

// The fixes report 12 m/s: a 150 m leap in a second is an outlier, dropped,
// unless the next fix lands near it too.
TEST_F(LocationFilterTest, JumpItsReportedSpeedCannotExplainWaitsForTheNextFix) {
    Location::LocationFilterAverage chain;
    for (int i = 0; i < 4; ++i) {
        chain.filter(fix(12.0f * i, 0, i + 1, 12.0f, 0.0f, 10.0f));
    }
    EXPECT_LT(chain.filter(fix(36.0f, 150.0f, 5, 12.0f, 0.0f, 10.0f)).accuracy, 0.0f);
    const Fix backOnTrack = fix(60.0f, 0, 6, 12.0f, 0.0f, 10.0f);
    EXPECT_LT(metresBetween(backOnTrack, chain.filter(backOnTrack)), 1.5f);

    // The receiver really is elsewhere: the second fix there confirms it.
    EXPECT_LT(chain.filter(fix(200.0f, 0, 7, 12.0f, 0.0f, 10.0f)).accuracy, 0.0f);
    const Fix confirmed = fix(212.0f, 0, 8, 12.0f, 0.0f, 10.0f);
    const Fix out = chain.filter(confirmed);
    EXPECT_GE(out.accuracy, 0.0f);
    EXPECT_LT(metresBetween(confirmed, out), 0.5f);
}

// A receiver driving a straight road without noise: the smoothed position
// must be where the car is, not where it was a fix or two ago.
struct Drive {
    float speed;
    float course;
    bool reportsBearing;
};

void PrintTo(const Drive& drive, std::ostream* out) {
    *out << drive.speed << " m/s at " << drive.course << (drive.reportsBearing ? "" : " without bearing");
}

class LocationFilterDriveTest : public LocationFilterTest, public ::testing::WithParamInterface<Drive> {};

TEST_P(LocationFilterDriveTest, NoiselessStraightDriveComesOutWhereTheCarIs) {
    const Drive drive = GetParam();
    const float radians = drive.course * 0.017453292f;
    Location::LocationFilterAverage chain;
    Location::LocationFilterKalman kalman;
    for (int i = 0; i < 20; ++i) {
        const float along = drive.speed * i;
        Fix truth = fix(along * kdCosf(radians), along * kdSinf(radians), i + 1, drive.speed,
                        drive.reportsBearing ? drive.course : -1.0f, 8.0f);
        truth.fixTime = 1000 * (i + 1);
        EXPECT_LT(metresBetween(truth, chain.filter(truth)), 1.5f) << "chain, fix " << i;
        EXPECT_LT(metresBetween(truth, kalman.filter(truth)), drive.reportsBearing ? 1.5f : 3.0f)
            << "Kalman, fix " << i;
    }
}

INSTANTIATE_TEST_SUITE_P(Drives, LocationFilterDriveTest,
                         ::testing::Values(Drive{14.0f, 90.0f, true}, Drive{30.0f, 225.0f, true},
                                           Drive{2.0f, 330.0f, true}, Drive{14.0f, 160.0f, false}));

TEST_F(LocationFilterTest, PositionAverageCarriesOlderFixesAlongTheirReportedMotion) {
    struct Case {
        float speed, bearing;
        KDust secondsApart;
        float north, east;  // where three fixes at one spot average to
    };
    const Case cases[] = {
        {-1.0f, -1.0f, 1, 0, 0},                         // no speed: averaged where they are
        {0.5f, -1.0f, 1, 0, 0},                          // standing receivers report no bearing
        {5.0f, 90.0f, 1, 0, 5},                          // mean of 10, 5 and 0 m carried east
        {5.0f, 0.0f, 1, 5, 0},   {5.0f, 0.0f, 0, 0, 0},  // no time between them, nothing to carry
        {5.0f, -1.0f, 1, 0, 0},                          // moving, but nowhere known: the newest alone
    };
    for (const Case& c : cases) {
        Location::LocationFilterAveragePosition average;
        Fix out;
        for (KDust i = 0; i < 3; ++i) {
            Fix spot =
                fixNear(kLat, kLon, 0, 0, 10.0f, (10 + i * c.secondsApart) * kSecond, c.speed, c.bearing);
            spot.altitude = 100.0f + i;
            out = average.filter(spot);
        }
        const Fix expected = fix(c.north, c.east, 0);
        EXPECT_LT(metresBetween(expected, out), 0.3f) << c.speed << " m/s at " << c.bearing;
        EXPECT_EQ(c.speed == 5.0f && c.bearing < 0.0f ? 102.0f : 101.0f, out.altitude);
    }
}

TEST_F(LocationFilterTest, PositionAverageAcrossTheDateLineStaysThere) {
    Location::LocationFilterAveragePosition average;
    Fix out;
    for (float longitude : {179.9999f, -179.9999f, 179.9999f}) {
        out = average.filter(fixNear(kLat, longitude, 0, 0, 10.0f, kSecond));
    }
    EXPECT_GT(kdFabsf(out.longitude), 179.999f);
    EXPECT_LE(kdFabsf(out.longitude), 180.0f);
}

// The provider cleans fixes before filtering; the position filters must not
// turn what slips through into a position off the map.
TEST_F(LocationFilterTest, UnusableSpeedsAndBearingsLeaveFinitePositions) {
    const float nan = std::numeric_limits<float>::quiet_NaN();
    const float inf = std::numeric_limits<float>::infinity();
    const float values[][2] = {{nan, 90.0f}, {14.0f, nan}, {inf, 90.0f}, {14.0f, inf}, {-5.0f, 90.0f}};
    for (const auto& value : values) {
        Location::LocationFilterMinDistance minDistance;
        Location::LocationFilterAveragePosition average;
        Location::LocationFilterKalman kalman;
        for (int i = 0; i < 6; ++i) {
            Fix bad = fix(14.0f * i, 0, i + 1, value[0], value[1], 8.0f);
            bad.fixTime = i % 2 == 0 ? 1000 * (i + 1) : std::numeric_limits<KDint64>::max();
            for (const Fix& out : {average.filter(minDistance.filter(bad)), kalman.filter(bad)}) {
                EXPECT_TRUE(out.hasUsablePosition()) << value[0] << " m/s at " << value[1] << ", fix " << i;
                EXPECT_LT(metresBetween(bad, out), 100.0f) << value[0] << " m/s at " << value[1];
            }
        }
    }
}

TEST_F(LocationFilterTest, CourseAverageIsCircular) {
    Location::LocationFilterAverageCourse average;
    Fix a = fix(0, 0, 1);
    a.bearing = a.bearingXY = 350.0f;
    Fix b = fix(0, 0, 2);
    b.bearing = b.bearingXY = 10.0f;
    average.filter(a);
    const Fix out = average.filter(b);
    EXPECT_GE(out.bearing, 0.0f);
    EXPECT_LT(out.bearing, 360.0f);
    EXPECT_LT(out.bearing < 180.0f ? out.bearing : 360.0f - out.bearing, 1e-3f);
    EXPECT_EQ(out.bearing, out.bearingXY);
}

TEST_F(LocationFilterTest, SpeedStaysWhenTimeDoesNotMoveForward) {
    Location::LocationFilterGenerateSpeed speed;
    speed.filter(fix(0, 0, 10));
    // 10 m in a second, as far as single-precision distances resolve it.
    const float moving = speed.filter(fix(10, 0, 11)).speed;
    EXPECT_NEAR(10.0f, moving, 2.0f);
    // A window whose times all agree, then a fix from before the window.
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(moving, speed.filter(fix(10, 0, 11)).speed) << i;
    }
    const Fix out = speed.filter(fix(500, 0, 3));
    EXPECT_EQ(moving, out.speed);
    EXPECT_GT(out.speedXY, 0);
    // A fix that brings its own speed keeps it.
    EXPECT_EQ(4.5f, speed.filter(fix(0, 0, 20, 4.5f)).speed);
}

TEST_F(LocationFilterTest, NetworkAndDroppedFixesDoNotTouchTheChain) {
    Location::LocationFilterAverage chain;
    const Fix network =
        fixNear(kLat, kLon, 400, 0, 150.0f, kSecond, -1.0f, -1.0f, Location::PrecisionNetwork);
    const Fix passed = chain.filter(network);
    EXPECT_EQ(network.latitude, passed.latitude);
    EXPECT_EQ(network.x, passed.x);
    EXPECT_EQ(network.accuracy, passed.accuracy);
    EXPECT_EQ(network.speed, passed.speed);
    EXPECT_EQ(Location::PrecisionNetwork, passed.precision);

    Fix noAccuracy = fix(0, 0, 2);
    noAccuracy.accuracy = -1.0f;
    Fix noPrecision = fix(0, 0, 2);
    noPrecision.precision = Location::PrecisionNone;
    for (const Fix& bad : {noAccuracy, noPrecision}) {
        const Fix dropped = chain.filter(bad);
        EXPECT_LT(dropped.accuracy, 0.0f);
        EXPECT_EQ(Location::PrecisionNone, dropped.precision);
    }
    // The first satellite fix after them is still treated as the first.
    EXPECT_EQ(0.0f, chain.filter(fix(0, 0, 3)).speed);
}

TEST_F(LocationFilterTest, FixBearingsAreKeptAndSmoothedWhileMoving) {
    Location::LocationFilterAverage chain;
    const float bearings[] = {90.0f, 90.0f, 100.0f, 110.0f, 120.0f};
    for (int i = 0; i < 5; ++i) {
        const Fix out = chain.filter(fix(0, 15.0f * i, i + 1, 15.0f, bearings[i], 8.0f));
        EXPECT_EQ(Location::PrecisionSatellite, out.precision) << i;
        const float expected = i < 2 ? 90.0f : (bearings[i - 2] + bearings[i - 1] + bearings[i]) / 3.0f;
        EXPECT_NEAR(expected, out.bearing, 0.05f) << i;
    }
}

TEST_F(LocationFilterTest, CourseWithoutFixBearingsComesFromTheTrack) {
    struct Heading {
        float north, east, course;
    };
    for (const Heading& heading :
         {Heading{1, 0, 0}, Heading{0, 1, 90}, Heading{-1, 0, 180}, Heading{0, -1, 270}}) {
        Location::LocationFilterGenerateCourse course;
        Fix out;
        for (int i = 0; i < 4; ++i) {
            out = course.filter(fix(30.0f * i * heading.north, 30.0f * i * heading.east, i + 1, 1.0f));
        }
        EXPECT_NEAR(heading.course, out.bearing, 0.5f);
        EXPECT_EQ(Location::PrecisionSatellite, out.precision);
    }
}

TEST_F(LocationFilterTest, KalmanSmoothsRestartsAfterResetAndIgnoresInvalidFixes) {
    Location::LocationFilterKalman kalman;
    const Fix truth = fix(0, 0, 0);
    float rawError = 0.0f;
    float filteredError = 0.0f;
    for (int i = 1; i <= 30; ++i) {
        const Fix noisy = fix(jitter(i, 3) * 2.0f, jitter(i, 4) * 2.0f, i, -1.0f, -1.0f, 10.0f);
        const Fix out = kalman.filter(noisy);
        if (i > 10) {
            rawError += metresBetween(truth, noisy);
            filteredError += metresBetween(truth, out);
        }
    }
    EXPECT_LT(filteredError, 0.6f * rawError);

    Fix invalid = fix(900, 900, 31);
    invalid.accuracy = -1.0f;
    EXPECT_LT(kalman.filter(invalid).accuracy, 0.0f);
    EXPECT_LT(metresBetween(truth, kalman.filter(fix(0, 0, 32, -1.0f, -1.0f, 10.0f))), 10.0f);

    kalman.reset();
    const Fix elsewhere = fix(5000, 5000, 33, -1.0f, -1.0f, 10.0f);
    EXPECT_LT(metresBetween(elsewhere, kalman.filter(elsewhere)), 3.0f);
}

TEST_F(LocationFilterTest, GapLongerThanAFewFixIntervalsRestartsTheChain) {
    Location::LocationFilterAverage chain;
    for (int i = 1; i <= 5; ++i) {
        chain.filter(fix(0, 0, i));
    }
    // An hour later, 60 m on: not averaged with where the receiver stood then.
    const Fix later = fix(60, 0, 3605);
    EXPECT_LT(metresBetween(later, chain.filter(later)), 0.5f);
    // Within the gap the chain still smooths.
    const Fix soon = fix(60, 3, 3605 + 5);
    EXPECT_LT(metresBetween(later, chain.filter(soon)), 0.5f);
}

// Each fix reports its speed; one reports 100 m/s with its position still on
// the track.
TEST_F(LocationFilterTest, SpeedSpikeDoesNotThrowThePositionAhead) {
    Location::LocationFilterAverage chain;
    Location::LocationFilterKalman kalman;
    for (int i = 1; i <= 12; ++i) {
        const float reported = i == 6 ? 100.0f : 10.0f;
        const Fix onTrack = fix(10.0f * i, 0, i, reported, 0.0f, 8.0f);
        EXPECT_LT(metresBetween(onTrack, chain.filter(onTrack)), 2.0f) << i;
        EXPECT_LT(metresBetween(onTrack, kalman.filter(onTrack)), 3.0f) << i;
    }
}

TEST_F(LocationFilterTest, PositionAverageNearThePoleStaysOnTheMap) {
    Location::LocationFilterAveragePosition average;
    Location::LocationFilterKalman kalman;
    // Heading north at 30 m/s towards the pole, the last fix on it.
    for (int i = 0; i < 3; ++i) {
        const Fix heading =
            fixNear(89.9996f + 0.0002f * i, 10.0f, 0, 0, 5.0f, (i + 1) * kSecond, 30.0f, 0.0f);
        const Fix out = average.filter(heading);
        EXPECT_LE(out.latitude, 90.0f) << i;
        EXPECT_LE(kalman.filter(heading).latitude, 90.0f) << i;
    }
}

TEST_F(LocationFilterTest, MinDistanceHoldsPositionsOnTheEquatorAndPrimeMeridian) {
    for (const Fix& first :
         {fixNear(0.0f, 10.0f, 0, 0, 20.0f, kSecond), fixNear(10.0f, 0.0f, 0, 0, 20.0f, kSecond)}) {
        Location::LocationFilterMinDistance minDistance;
        minDistance.filter(first);
        const Fix jittered = fixNear(first.latitude, first.longitude, 3, 3, 20.0f, 2 * kSecond);
        const Fix held = minDistance.filter(jittered);
        EXPECT_EQ(first.latitude, held.latitude);
        EXPECT_EQ(first.longitude, held.longitude);
    }
}

TEST_F(LocationFilterTest, MissingAltitudeIsLeftOutOfTheAverage) {
    Location::LocationFilterAveragePosition average;
    const float altitudes[] = {100.0f, -1.0f, 110.0f};
    Fix out;
    for (int i = 0; i < 3; ++i) {
        Fix standing = fix(0, 0, i + 1);
        standing.altitude = altitudes[i];
        out = average.filter(standing);
    }
    EXPECT_FLOAT_EQ(105.0f, out.altitude);
    for (int i = 0; i < 3; ++i) {
        Fix unknown = fix(0, 0, i + 4);
        unknown.altitude = -1.0f;
        out = average.filter(unknown);
    }
    EXPECT_EQ(-1.0f, out.altitude);
}

// A receiver whose speed and bearing are as noisy as its position: a filter
// that predicts straight from the reported velocities keeps their noise, one
// that estimates the velocity averages it out over the drive. Five-minute
// drives, so that the first fixes, which no filter can do much about, count
// for little.
TEST_F(LocationFilterTest, KalmanOnNoisyDrivesStaysWellWithinTheRawError) {
    float rawSquares = 0.0f;
    float filteredSquares = 0.0f;
    for (unsigned seed = 1; seed <= 5; ++seed) {
        const NoisyTrack track = noisyStraightTrack(seed, 300, 14.0f, 70.0f, 3.0f, 8.0f, 0.5f, 3.0f);
        Location::LocationFilterKalman kalman;
        std::vector<Fix> shown;
        for (const Fix& fix : track.fixes) {
            shown.push_back(kalman.filter(fix));
        }
        const float raw = rmsError(track, track.fixes);
        const float filtered = rmsError(track, shown);
        rawSquares += raw * raw;
        filteredSquares += filtered * filtered;
        EXPECT_LT(filtered, 0.5f * raw) << "seed " << seed;
        EXPECT_LT(largestStepBack(shown, 70.0f), 1.0f) << "seed " << seed;
    }
    EXPECT_LT(std::sqrt(filteredSquares), 0.42f * std::sqrt(rawSquares));
}

// Noiseless fixes: east at 14 m/s, a turn north, one fix whose speed drops to
// zero while its position goes on, then a real stop.
TEST_F(LocationFilterTest, KalmanFollowsTurnsAndStopsButNotAOneFixSpeedGlitch) {
    Location::LocationFilterKalman kalman;
    float north = 0.0f;
    float east = 0.0f;
    for (int i = 0; i < 60; ++i) {
        const bool stopped = i >= 50;
        const float bearing = i < 20 ? 90.0f : 0.0f;
        const float speed = stopped || i == 35 ? 0.0f : 14.0f;
        Fix reported = fix(north, east, i + 1, speed, stopped ? -1.0f : bearing, 8.0f);
        reported.fixTime = 1000 * (i + 1);
        EXPECT_LT(metresBetween(reported, kalman.filter(reported)), 1.5f) << "fix " << i;
        if (!stopped) {
            north += bearing == 0.0f ? 14.0f : 0.0f;
            east += bearing == 90.0f ? 14.0f : 0.0f;
        }
    }
}

// Walking with fixes noisier than their accuracy says: the mean of three can
// fall metres behind the last one shown, and the chain must not show it.
TEST_F(LocationFilterTest, ChainNeverStepsBackAlongTheWayOfANoisyWalk) {
    for (unsigned seed = 1; seed <= 8; ++seed) {
        const NoisyTrack track = noisyStraightTrack(seed, 120, 1.4f, 20.0f, 6.0f, 10.0f, 0.3f, 12.0f);
        Location::LocationFilterAverage chain;
        std::vector<Fix> shown;
        // A dropped fix leaves the last position shown.
        for (const Fix& fix : track.fixes) {
            const Fix out = chain.filter(fix);
            shown.push_back(out.accuracy >= 0.0f || shown.empty() ? out : shown.back());
        }
        // The marker may wobble back a little within the noise (how much differs with each
        // platform's maths library), never by the metres of the old average.
        EXPECT_LT(largestStepBack(shown, 20.0f), 5.0f) << "seed " << seed;
        EXPECT_LT(rmsError(track, shown), rmsError(track, track.fixes)) << "seed " << seed;
    }
}

}  // namespace
