#include <gtest/gtest.h>

#include <limits>

#include "math/CoordConversion.h"

namespace {

const int kWorldWidth = 0x7FFFFFFF;
const int kIntMin = -0x7FFFFFFF - 1;
const int kEquatorRow = 1 << 30;

int xOf(float lat, float lon) {
    int x, y;
    CoordConversion::toXY(lat, lon, x, y);
    return x;
}

int yOf(float lat, float lon) {
    int x, y;
    CoordConversion::toXY(lat, lon, x, y);
    return y;
}

}  // namespace

TEST(CoordConversionTest, ProjectionSaturatesAtTheWorldEdgesAndClampsLatitude) {
    EXPECT_EQ(0, xOf(0.0f, -180.0f));
    EXPECT_EQ(0, xOf(0.0f, -180.5f));
    EXPECT_EQ(kEquatorRow, xOf(0.0f, 0.0f));
    // 180 degrees is 2^31 units, one past the largest int: it saturates.
    EXPECT_EQ(kWorldWidth, xOf(0.0f, 180.0f));
    EXPECT_EQ(kWorldWidth, xOf(0.0f, 1000.0f));

    EXPECT_EQ(kEquatorRow, yOf(0.0f, 0.0f));
    EXPECT_EQ(yOf(89.3f, 0.0f), yOf(90.0f, 0.0f));
    EXPECT_EQ(yOf(-89.3f, 0.0f), yOf(-90.0f, 0.0f));
    EXPECT_LT(yOf(89.3f, 0.0f), yOf(89.2f, 0.0f));

    const float nan = std::numeric_limits<float>::quiet_NaN();
    EXPECT_EQ(0, xOf(nan, nan));
    EXPECT_EQ(0, yOf(nan, nan));
}

TEST(CoordConversionTest, EveryLongitudeLiesInsideTheWorldWhateverTheFloatingPointUnit) {
    int previous = 0;
    for (float lon = -180.0f; lon <= 180.0f; lon += 0.0625f) {
        const int x = xOf(0.0f, lon);
        EXPECT_LE(previous, x) << "longitude " << lon;
        previous = x;
    }
}

TEST(CoordConversionTest, RowsGrowSouthwardsAndSaturateSouthOfTheWorldSquare) {
    // Rows south of about -85.05 degrees lie beyond 2^31; they must stay at
    // the south edge, not wrap round to the north by an overflowing negation.
    int previous = yOf(89.3f, 0.0f);
    for (float lat = 89.2f; lat >= -89.3f; lat -= 0.1f) {
        const int y = yOf(lat, 0.0f);
        EXPECT_LE(previous, y) << "latitude " << lat;
        previous = y;
    }
    EXPECT_EQ(kWorldWidth, yOf(-85.1f, 0.0f));
    EXPECT_GT(yOf(-85.0f, 0.0f), 2140000000);
    // Each row carries the rounding of a float northing near 2^25 m (4 m steps,
    // 214 units) and of the tangent; 1024 units are 19 m.
    for (float lat = 0.5f; lat < 85.0f; lat += 4.5f) {
        EXPECT_NEAR(2.0 * kEquatorRow, double(yOf(lat, 0.0f)) + yOf(-lat, 0.0f), 1024.0) << lat;
    }
}

TEST(CoordConversionTest, InverseProjectionReturnsThePointOverTheWholeWorld) {
    // The metre values on the way lie near 2^25, where floats are 4 m apart;
    // two such roundings each way stay within 8 m, 7.2e-5 degrees.
    const float tolerance = 8e-5f;
    for (float lat = -85.0f; lat <= 89.3f; lat += 0.37f) {
        for (float lon = -180.0f; lon < 180.0f; lon += 1.13f) {
            int x, y;
            CoordConversion::toXY(lat, lon, x, y);
            float lat2, lon2;
            CoordConversion::toLL(x, y, lat2, lon2);
            ASSERT_NEAR(lat, lat2, tolerance) << lat << ", " << lon;
            ASSERT_NEAR(lon, lon2, tolerance) << lat << ", " << lon;
        }
    }
}

TEST(CoordConversionTest, InverseProjectionClampsLongitudeKeepingItsSign) {
    float lat, lon;
    CoordConversion::toLL(kWorldWidth, kEquatorRow, lat, lon);
    EXPECT_NEAR(180.0f, lon, 1e-4f);
    EXPECT_LE(lon, 180.0f);
    CoordConversion::toLL(-1500000000, kEquatorRow, lat, lon);
    EXPECT_FLOAT_EQ(-180.0f, lon);
    CoordConversion::toLL(kIntMin, kIntMin, lat, lon);
    EXPECT_FLOAT_EQ(-180.0f, lon);
    EXPECT_GT(lat, 89.9f);
    EXPECT_LE(lat, 90.0f);
    CoordConversion::toLL(0, kWorldWidth, lat, lon);
    EXPECT_LT(lat, -85.0f);
}

TEST(CoordConversionTest, CoincidentOrUnresolvablyClosePointsAreZeroApartNotNaN) {
    const float points[][2] = {{0, 0}, {52.52f, 13.405f}, {-33.9f, 151.2f}, {90, 0}, {-90, 180}, {80, -180}};
    for (const auto& p : points) {
        EXPECT_EQ(0.0f, CoordConversion::getDistance(p[0], p[1], p[0], p[1])) << p[0] << ", " << p[1];
    }
    int x, y;
    CoordConversion::toXY(52.52f, 13.405f, x, y);
    EXPECT_EQ(0.0f, CoordConversion::getDistance(x, y, x, y));
    // The haversine term underflows, so sin C is 0 and the azimuth is 0 / 0.
    EXPECT_EQ(0.0f, CoordConversion::getDistance(0.0f, 0.0f, 1e-25f, 0.0f));
    EXPECT_EQ(0.0f, CoordConversion::getDistance(1e-30f, 1e-30f, 0.0f, 0.0f));
    EXPECT_EQ(0.0f, CoordConversion::getDistance(45.0f, 180.0f, 45.0f, -180.0f));
    EXPECT_EQ(0.0f, CoordConversion::getDistanceXY(0.0f, 12345.0f));
    EXPECT_EQ(0.0f, CoordConversion::getDistanceXY(1e-40f, float(kEquatorRow)));
}

TEST(CoordConversionTest, DistanceAcrossTheAntimeridianIsAsPreciseAsElsewhere) {
    // Two floats 1.5e-5 degrees either side of the antimeridian, about 3.3 m
    // apart; a difference of nearly 360 degrees would round away metres.
    const float east = 179.99998f;
    const float west = -179.99998f;
    const float across = CoordConversion::getDistance(10.0f, east, 10.0f, west);
    const float mirrored = CoordConversion::getDistance(10.0f, east - 180.0f, 10.0f, west + 180.0f);
    EXPECT_FLOAT_EQ(mirrored, across);
    EXPECT_NEAR(3.34f, across, 0.01f);
    EXPECT_FLOAT_EQ(across, CoordConversion::getDistance(10.0f, west, 10.0f, east));
}

TEST(CoordConversionTest, WorldAndRowDistancesMatchTheGeographicForm) {
    int x1, y1, x2, y2;
    CoordConversion::toXY(52.5200f, 13.4050f, x1, y1);
    CoordConversion::toXY(52.3906f, 13.0645f, x2, y2);
    // Both points carry the projection's metre-sized rounding.
    EXPECT_NEAR(CoordConversion::getDistance(52.5200f, 13.4050f, 52.3906f, 13.0645f),
                CoordConversion::getDistance(x1, y1, x2, y2), 10.0f);

    // 1000 projected metres on the equator are 1000 m on the ground, either way.
    EXPECT_NEAR(1000.0f, CoordConversion::getDistanceXY(53586.594f, float(kEquatorRow)), 0.01f);
    EXPECT_EQ(CoordConversion::getDistanceXY(53586.594f, float(kEquatorRow)),
              CoordConversion::getDistanceXY(-53586.594f, float(kEquatorRow)));
    const float row = float(yOf(60.0f, 0.0f));
    const float run = 2000000.0f;  // world units, about 0.335 degrees
    float lat, lon;
    CoordConversion::toLL(0, int(row), lat, lon);
    EXPECT_NEAR(CoordConversion::getDistance(lat, 0.0f, lat, run / 341782624.0f * 57.295776f),
                CoordConversion::getDistanceXY(run, row), 0.05f);
}

TEST(CoordConversionTest, GroundLengthsScaleWithLatitudeAndSaturate) {
    int xy;
    CoordConversion::MtoXY(0.0f, 1000.0f, xy);
    EXPECT_EQ(53586, xy);
    CoordConversion::MtoXY(60.0f, 1000.0f, xy);
    EXPECT_NEAR(107173, xy, 1);
    float metres;
    CoordConversion::XYtoM(60.0f, xy, metres);
    EXPECT_NEAR(1000.0f, metres, 0.02f);

    // The float cosine of 90 degrees is -4e-8; the length must not turn negative.
    CoordConversion::MtoXY(90.0f, 10.0f, xy);
    EXPECT_EQ(kWorldWidth, xy);
    CoordConversion::MtoXY(-90.0f, 10.0f, xy);
    EXPECT_EQ(kWorldWidth, xy);
    CoordConversion::MtoXY(0.0f, -1e9f, xy);
    EXPECT_EQ(kIntMin, xy);
    EXPECT_EQ(kWorldWidth, CoordConversion::MercToXY(1e8f));
    EXPECT_EQ(kIntMin, CoordConversion::MercToXY(-1e8f));
    EXPECT_EQ(kEquatorRow, CoordConversion::MercToXY(20037508.0f));
    EXPECT_NEAR(20037508.0f, CoordConversion::XYtoMerc(kEquatorRow), 2.0f);
}
