#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>

#include "util/Random.h"

TEST(RandomTest, ValuesSpanTheBoundsGivenInEitherOrder) {
    srand48(7);
    float lowest = 10.0f;
    float highest = -10.0f;
    for (int i = 0; i < 10000; ++i) {
        for (const float value : {Random::nextFloat(-2.0f, 3.0f), Random::nextFloat(3.0f, -2.0f)}) {
            ASSERT_GE(value, -2.0f);
            ASSERT_LE(value, 3.0f);
            lowest = std::min(lowest, value);
            highest = std::max(highest, value);
        }
    }
    EXPECT_LT(lowest, -1.9f);
    EXPECT_GT(highest, 2.9f);
    EXPECT_EQ(4.5f, Random::nextFloat(4.5f, 4.5f));
}
