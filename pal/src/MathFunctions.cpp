// Single-precision mathematics of the platform: the float overloads of
// <cmath>, so no value is widened to double on the way.
#include <KD/kd.h>

#include <cmath>

KDfloat32 kdAcosf(KDfloat32 x) {
    return std::acos(x);
}
KDfloat32 kdAsinf(KDfloat32 x) {
    return std::asin(x);
}
KDfloat32 kdAtanf(KDfloat32 x) {
    return std::atan(x);
}
KDfloat32 kdAtan2f(KDfloat32 y, KDfloat32 x) {
    return std::atan2(y, x);
}
KDfloat32 kdCosf(KDfloat32 x) {
    return std::cos(x);
}
KDfloat32 kdSinf(KDfloat32 x) {
    return std::sin(x);
}
KDfloat32 kdTanf(KDfloat32 x) {
    return std::tan(x);
}
KDfloat32 kdExpf(KDfloat32 x) {
    return std::exp(x);
}
KDfloat32 kdLogf(KDfloat32 x) {
    return std::log(x);
}
KDfloat32 kdFabsf(KDfloat32 x) {
    return std::fabs(x);
}
KDfloat32 kdPowf(KDfloat32 x, KDfloat32 y) {
    return std::pow(x, y);
}
KDfloat32 kdSqrtf(KDfloat32 x) {
    return std::sqrt(x);
}
KDfloat32 kdCeilf(KDfloat32 x) {
    return std::ceil(x);
}
KDfloat32 kdFloorf(KDfloat32 x) {
    return std::floor(x);
}
KDfloat32 kdRoundf(KDfloat32 x) {
    return std::round(x);
}
KDfloat32 kdInvsqrtf(KDfloat32 x) {
    return 1.0f / std::sqrt(x);
}
KDfloat32 kdFmodf(KDfloat32 x, KDfloat32 y) {
    return std::fmod(x, y);
}
