#include <gtest/gtest.h>

#include <GeographicLib/Geodesic.hpp>
#include <cmath>
#include <cstdio>
#include <random>
#include <string>

#include "math/CoordConversion.h"

namespace {

// Random pairs closer than 100 km, both ends within the latitude limit, with a
// log-uniform spread of distances from 1 m so that short hops, where single
// precision hurts most, are as common as long ones. The reference measures
// the very float coordinates our function gets. Returns the worst relative
// error and describes its pair in worstPair.
double worstErrorAgainstGeodesic(unsigned seed, int pairs, double maxLatitude, std::string& worstPair) {
    const GeographicLib::Geodesic& wgs84 = GeographicLib::Geodesic::WGS84();
    std::mt19937 random(seed);
    std::uniform_real_distribution<double> latitude(-maxLatitude, maxLatitude);
    std::uniform_real_distribution<double> longitude(-180.0, 180.0);
    std::uniform_real_distribution<double> azimuth(-180.0, 180.0);
    std::uniform_real_distribution<double> logDistance(0.0, std::log(99999.0));
    double worst = 0;
    for (int done = 0; done < pairs;) {
        const float lat1 = static_cast<float>(latitude(random));
        const float lon1 = static_cast<float>(longitude(random));
        double lat2Exact, lon2Exact;
        wgs84.Direct(lat1, lon1, azimuth(random), std::exp(logDistance(random)), lat2Exact, lon2Exact);
        const float lat2 = static_cast<float>(lat2Exact);
        const float lon2 = static_cast<float>(lon2Exact);
        if (std::fabs(lat2) > maxLatitude || (lat1 == lat2 && lon1 == lon2)) {
            continue;
        }
        double reference;
        wgs84.Inverse(lat1, lon1, lat2, lon2, reference);
        const double measured = CoordConversion::getDistance(lat1, lon1, lat2, lon2);
        const double relativeError = std::fabs(measured - reference) / reference;
        if (relativeError > worst) {
            worst = relativeError;
            char text[160];
            std::snprintf(text, sizeof(text), "(%.7f, %.7f) - (%.7f, %.7f) measured %.4f m, geodesic %.4f m",
                          lat1, lon1, lat2, lon2, measured, reference);
            worstPair = text;
        }
        ++done;
    }
    return worst;
}

// The distance is a spherical central angle C times Euler's radius of
// curvature R(alpha) = M N / (N cos^2 alpha + M sin^2 alpha) at the mean
// latitude, all in single precision. Against the WGS 84 geodesic its relative
// error for hops under 100 km has these parts (e2 = 0.00669, d/a <= 0.0157,
// eps = (N - M) / N = e2 cos^2 phi):
// - its constants take e2 as 2f = 0.0067056, dropping f^2 = 1.1e-5, which
//   shrinks a(1 - e2) and so M by up to 1.1e-5 (N moves by less);
// - C is an angle in geographic coordinates, so C R(alpha) is the local
//   metric length sqrt(M^2 dphi^2 + N^2 cos^2 phi dlambda^2) only to first
//   order in eps; the second-order rest, 1.5 eps^2 sin^2 alpha cos^2 alpha,
//   is at most 0.375 e2^2 = 1.7e-5 (these two peak on the equator);
// - alpha is the azimuth at the first point while the geodesic turns by
//   about dlambda sin phi on the way; R(alpha) moves with alpha by
//   eps sin 2alpha, so one end instead of the middle costs up to
//   e2 cos phi sin phi (d/a) / 2 <= 2.6e-5 (largest at 45 degrees);
// - M and N at the mean latitude rather than along the path: e2 (d/a)^2,
//   below 2e-6;
// - float rounding: differences of the inputs are taken exactly, and some
//   twenty operations of 6e-8 each, amplified by tan(phi) <= 5.7 in the
//   cosines near 80 degrees, stay below 3e-6.
// The parts add up to 5.9e-5; the bound leaves a fifth more for the terms
// these first-order estimates drop.
const double kRelativeErrorBound = 7e-5;

}  // namespace

TEST(CoordConversionGeodesicTest, DistancesUnder100KmFollowTheWgs84Geodesic) {
    std::string worstPair;
    const double worst = worstErrorAgainstGeodesic(20240611u, 4000, 80.0, worstPair);
    RecordProperty("worst_relative_error", std::to_string(worst));
    EXPECT_LT(worst, kRelativeErrorBound) << worstPair;
}
