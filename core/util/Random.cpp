#include "util/Random.h"

#include <stdlib.h>

float Random::nextFloat(float t0, float t1) {
    const long r = lrand48() % 0x7FFFFFFF;
    const double u = static_cast<double>(r) / 2147483648.0;
    return static_cast<float>(t1 * u + t0 * (1.0 - u));
}
