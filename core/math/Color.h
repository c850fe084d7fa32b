#pragma once

#include <KD/kd.h>

namespace Math {

// An RGBA colour of four bytes. Value type; any thread.
class Color {
public:
    static const Color white;
    static const Color black;
    static const Color red;
    static const Color green;
    static const Color blue;
    static const Color gray;

    Color() : r(), g(), b(), a() {}
    Color(KDuint8 r_, KDuint8 g_, KDuint8 b_, KDuint8 a_) : r(r_), g(g_), b(b_), a(a_) {}

    // The colour with its brightness inverted and its hue roughly kept, packed
    // as a << 24 | b << 16 | g << 8 | r; alpha is kept.
    KDuint32 inverseRGB() const;

    KDuint8 r, g, b, a;
};

}  // namespace Math
