// Cost of the projection and of the distance, with GeographicLib's geodesic
// inverse (double precision, exact to nanometres) over the same pairs as the
// reference for what the single-precision spherical model saves.
#include <benchmark/benchmark.h>

#include <GeographicLib/Geodesic.hpp>
#include <random>
#include <vector>

#include "math/CoordConversion.h"

namespace {

struct Pair {
    float lat1, lon1, lat2, lon2;
    int x, y;
};

// Points within +-80 degrees and partners up to 100 km away, as the location
// filters see them; a fixed seed makes runs comparable.
const std::vector<Pair>& pairs() {
    static const std::vector<Pair> all = [] {
        std::mt19937 random(42);
        std::uniform_real_distribution<double> latitude(-80.0, 80.0);
        std::uniform_real_distribution<double> longitude(-180.0, 180.0);
        std::uniform_real_distribution<double> azimuth(-180.0, 180.0);
        std::uniform_real_distribution<double> distance(0.0, 100000.0);
        std::vector<Pair> result(4096);
        for (Pair& p : result) {
            double lat2, lon2;
            p.lat1 = static_cast<float>(latitude(random));
            p.lon1 = static_cast<float>(longitude(random));
            GeographicLib::Geodesic::WGS84().Direct(p.lat1, p.lon1, azimuth(random), distance(random), lat2,
                                                    lon2);
            p.lat2 = static_cast<float>(lat2);
            p.lon2 = static_cast<float>(lon2);
            CoordConversion::toXY(p.lat1, p.lon1, p.x, p.y);
        }
        return result;
    }();
    return all;
}

void BM_ToXY(benchmark::State& state) {
    const std::vector<Pair>& all = pairs();
    size_t i = 0;
    for (auto _ : state) {
        const Pair& p = all[i++ & 4095];
        int x, y;
        CoordConversion::toXY(p.lat1, p.lon1, x, y);
        benchmark::DoNotOptimize(x);
        benchmark::DoNotOptimize(y);
    }
}
BENCHMARK(BM_ToXY);

void BM_ToLL(benchmark::State& state) {
    const std::vector<Pair>& all = pairs();
    size_t i = 0;
    for (auto _ : state) {
        const Pair& p = all[i++ & 4095];
        float lat, lon;
        CoordConversion::toLL(p.x, p.y, lat, lon);
        benchmark::DoNotOptimize(lat);
        benchmark::DoNotOptimize(lon);
    }
}
BENCHMARK(BM_ToLL);

void BM_GetDistance(benchmark::State& state) {
    const std::vector<Pair>& all = pairs();
    size_t i = 0;
    for (auto _ : state) {
        const Pair& p = all[i++ & 4095];
        benchmark::DoNotOptimize(CoordConversion::getDistance(p.lat1, p.lon1, p.lat2, p.lon2));
    }
}
BENCHMARK(BM_GetDistance);

void BM_GeographicLibInverse(benchmark::State& state) {
    const std::vector<Pair>& all = pairs();
    const GeographicLib::Geodesic& wgs84 = GeographicLib::Geodesic::WGS84();
    size_t i = 0;
    for (auto _ : state) {
        const Pair& p = all[i++ & 4095];
        double distance;
        wgs84.Inverse(p.lat1, p.lon1, p.lat2, p.lon2, distance);
        benchmark::DoNotOptimize(distance);
    }
}
BENCHMARK(BM_GeographicLibInverse);

}  // namespace

BENCHMARK_MAIN();
