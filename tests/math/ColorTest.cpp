#include <gtest/gtest.h>

#include "math/Color.h"

using Math::Color;

TEST(ColorTest, InverseFlipsBrightnessKeepsTheDominantChannelAndCarriesAlpha) {
    // Packed a, b, g, r from the high byte down.
    EXPECT_EQ(0xFF000000u, Color::white.inverseRGB());
    EXPECT_EQ(0xFFFFFFFFu, Color::black.inverseRGB());
    EXPECT_EQ(0xFF808080u, Color::gray.inverseRGB());
    EXPECT_EQ(0xFF9375F4u, Color::red.inverseRGB());
    EXPECT_EQ(0xFF75F493u, Color::green.inverseRGB());
    EXPECT_EQ(0xFFF49375u, Color::blue.inverseRGB());
    EXPECT_EQ(0xFF687DAEu, Color(200, 120, 40, 255).inverseRGB());
    EXPECT_EQ(0x40FFFFFFu, Color(0, 0, 0, 0x40).inverseRGB());
    EXPECT_EQ(0x00000000u, Color(255, 255, 255, 0).inverseRGB());
}
