#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>

#include "util/Random.h"

TEST(RandomTest, ValuesStayBetweenTheBoundsGivenInEitherOrder) {
    srand48(7);
    float lowest = 10.0f;
    float highest = -10.0f;
    for (int i = 0; i < 10000; ++i) {
        const float up = Random::nextFloat(-2.0f, 3.0f);
        const float down = Random::nextFloat(3.0f, -2.0f);
        ASSERT_GE(up, -2.0f);
        ASSERT_LE(up, 3.0f);
        ASSERT_GE(down, -2.0f);
        ASSERT_LE(down, 3.0f);
        lowest = std::min(lowest, up);
        highest = std::max(highest, up);
    }
    EXPECT_LT(lowest, -1.9f);
    EXPECT_GT(highest, 2.9f);
    EXPECT_EQ(4.5f, Random::nextFloat(4.5f, 4.5f));
}
