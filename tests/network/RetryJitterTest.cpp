#include <gtest/gtest.h>

#include <vector>

#include "network/RetryJitter.h"

using Network::RetryJitter;

TEST(RetryJitterTest, DrawsStayWithinTheirBoundsAndCoverThemEvenly) {
    RetryJitter jitter(42);
    std::vector<int> counts(4, 0);
    for (int i = 0; i < 4000; ++i) {
        const long long value = jitter.between(10, 13);
        ASSERT_GE(value, 10);
        ASSERT_LE(value, 13);
        ++counts[value - 10];
    }
    for (int count : counts) {
        EXPECT_GT(count, 850);
        EXPECT_LT(count, 1150);
    }
    EXPECT_EQ(7, jitter.between(7, 7));
    EXPECT_EQ(7, jitter.between(7, 3));
    const long long wide = jitter.between(0, 0x7fffffffffffffffll);
    EXPECT_GE(wide, 0);
}

TEST(RetryJitterTest, TheSameSeedRepeatsItsWaitsAndAnotherSeedDoesNot) {
    RetryJitter first(7);
    RetryJitter again(7);
    RetryJitter other(8);
    std::vector<long long> firstWaits, againWaits, otherWaits;
    for (int i = 0; i < 16; ++i) {
        firstWaits.push_back(first.between(1000, 120000));
        againWaits.push_back(again.between(1000, 120000));
        otherWaits.push_back(other.between(1000, 120000));
    }
    EXPECT_EQ(firstWaits, againWaits);
    EXPECT_NE(firstWaits, otherWaits);
}
