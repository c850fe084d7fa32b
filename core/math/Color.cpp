#include "math/Color.h"

namespace Math {

const Color Color::white(255, 255, 255, 255);
const Color Color::black(0, 0, 0, 255);
const Color Color::red(255, 0, 0, 255);
const Color Color::green(0, 255, 0, 255);
const Color Color::blue(0, 0, 255, 255);
const Color Color::gray(127, 127, 127, 255);

namespace {

// Mixing weights with 20 fraction bits; every row sums to 2^20, so a grey
// input stays grey. Each output draws mostly on the other two channels, which
// brings the hue of the plain inversion back round to the input's.
const KDuint32 kInverseMix[3][3] = {
    {42959, 441598, 564019},
    {564007, 43115, 441454},
    {441441, 564164, 42971},
};

KDuint32 mixChannel(const KDuint32 weights[3], KDuint32 ir, KDuint32 ig, KDuint32 ib) {
    return ((weights[0] * ir + weights[1] * ig + weights[2] * ib) >> 20) & 255;
}

}  // namespace

KDuint32 Color::inverseRGB() const {
    const KDuint32 ir = 255 - r;
    const KDuint32 ig = 255 - g;
    const KDuint32 ib = 255 - b;
    const KDuint32 outRed = mixChannel(kInverseMix[0], ir, ig, ib);
    const KDuint32 outGreen = mixChannel(kInverseMix[1], ir, ig, ib);
    const KDuint32 outBlue = mixChannel(kInverseMix[2], ir, ig, ib);
    return static_cast<KDuint32>(a) << 24 | outBlue << 16 | outGreen << 8 | outRed;
}

}  // namespace Math
