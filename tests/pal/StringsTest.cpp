// Bounded string calls and locale-independent number parsing of the platform.
#include <KD/kd.h>
#include <gtest/gtest.h>

#include <climits>
#include <clocale>
#include <cstring>
#include <string>

namespace {

const char kCanary = '\x5a';

// A buffer of `length` usable bytes followed by a canary byte that no bounded
// call may touch.
struct GuardedBuffer {
    explicit GuardedBuffer(KDsize length) : length(length), bytes(length + 1, '#') {
        bytes[length] = kCanary;
    }
    KDchar* data() { return &bytes[0]; }
    std::string text() const { return std::string(bytes.c_str()); }
    bool canaryIntact() const { return bytes[length] == kCanary; }

    KDsize length;
    std::string bytes;
};

TEST(StringsTest, SprintfCutsShortWithinTheBufferAndReportsTheFullLength) {
    for (KDsize length : {0u, 1u, 2u, 5u, 11u, 12u, 13u}) {
        SCOPED_TRACE(length);
        GuardedBuffer buffer(length);
        EXPECT_EQ(kdSprintf_s(buffer.data(), length, "%s-%d", "abcdef", 1234), 11);
        EXPECT_TRUE(buffer.canaryIntact());
        if (length > 0) {
            EXPECT_EQ(buffer.text(), std::string("abcdef-1234").substr(0, length - 1));
        }
    }
    EXPECT_EQ(kdSprintf_s(nullptr, 0, "%s", "sized"), 5);
}

TEST(StringsTest, StrcpyCopiesWhatFitsAndSaysWhetherAllDid) {
    GuardedBuffer exact(6);
    EXPECT_EQ(kdStrcpy_s(exact.data(), 6, "hello"), 0);
    EXPECT_EQ(exact.text(), "hello");

    GuardedBuffer small(5);
    EXPECT_NE(kdStrcpy_s(small.data(), 5, "hello"), 0);
    EXPECT_EQ(small.text(), "hell");
    EXPECT_TRUE(small.canaryIntact());

    GuardedBuffer none(0);
    EXPECT_NE(kdStrcpy_s(none.data(), 0, "x"), 0);
    EXPECT_TRUE(none.canaryIntact());
}

TEST(StringsTest, StrncatAppendsAtMostWhatFitsAndWhatWasAllowed) {
    GuardedBuffer buffer(8);
    ASSERT_EQ(kdStrcpy_s(buffer.data(), 8, "ab"), 0);
    EXPECT_EQ(kdStrncat_s(buffer.data(), 8, "cdef", 2), 0);
    EXPECT_EQ(buffer.text(), "abcd");
    EXPECT_NE(kdStrncat_s(buffer.data(), 8, "efghij", 6), 0);
    EXPECT_EQ(buffer.text(), "abcdefg");
    EXPECT_TRUE(buffer.canaryIntact());
    EXPECT_NE(kdStrncat_s(buffer.data(), 8, "x", 1), 0);
    EXPECT_EQ(buffer.text(), "abcdefg");

    GuardedBuffer unterminated(4);
    EXPECT_NE(kdStrncat_s(unterminated.data(), 4, "x", 1), 0);
    EXPECT_EQ(unterminated.text(), "###");
    EXPECT_TRUE(unterminated.canaryIntact());
}

// Locale names under which the decimal separator is a comma, tried in turn;
// machines without any of them skip the part of the test that needs one.
const char* const kCommaLocales[] = {"de_DE.UTF-8", "de_DE.utf8", "fr_FR.UTF-8", "ru_RU.UTF-8", "de_DE"};

TEST(StringsTest, StrtofReadsAPointWhateverTheProcessLocale) {
    KDchar* end = nullptr;
    const char text[] = " -12.5e1xyz";
    EXPECT_FLOAT_EQ(kdStrtof(text, &end), -125.0f);
    EXPECT_EQ(end, text + 8);

    struct RestoreLocale {
        ~RestoreLocale() { std::setlocale(LC_NUMERIC, previous.c_str()); }
        std::string previous = std::setlocale(LC_NUMERIC, nullptr);
    } restore;
    const char* comma = nullptr;
    for (const char* name : kCommaLocales) {
        if (std::setlocale(LC_NUMERIC, name) != nullptr) {
            comma = name;
            break;
        }
    }
    if (comma == nullptr) {
        GTEST_SKIP() << "no locale with a decimal comma installed";
    }
    ASSERT_STREQ(std::localeconv()->decimal_point, ",");
    const char decimal[] = "0.25,5";
    EXPECT_FLOAT_EQ(kdStrtof(decimal, &end), 0.25f);
    EXPECT_EQ(end, decimal + 4);
}

TEST(StringsTest, StrtolSaturatesAtThirtyTwoBits) {
    KDchar* end = nullptr;
    EXPECT_EQ(kdStrtol("2147483647", &end, 10), INT_MAX);
    EXPECT_EQ(kdStrtol("2147483648", &end, 10), INT_MAX);
    EXPECT_EQ(kdStrtol("-2147483649", &end, 10), INT_MIN);
    const char text[] = "  -42 rest";
    EXPECT_EQ(kdStrtol(text, &end, 10), -42);
    EXPECT_EQ(end, text + 5);
    EXPECT_EQ(kdStrtol("ff", nullptr, 16), 255);
    EXPECT_EQ(kdStrtol("0x1A", nullptr, 0), 26);
}

TEST(StringsTest, StrtoulWrapsNegativesAndSaturatesLikeThirtyTwoBitStrtoul) {
    EXPECT_EQ(kdStrtoul("4294967295", nullptr, 10), 4294967295u);
    EXPECT_EQ(kdStrtoul("4294967296", nullptr, 10), UINT_MAX);
    EXPECT_EQ(kdStrtoul("99999999999999999999999", nullptr, 10), UINT_MAX);
    EXPECT_EQ(kdStrtoul("-1", nullptr, 10), 4294967295u);
    EXPECT_EQ(kdStrtoul(" -5", nullptr, 10), 4294967291u);
    EXPECT_EQ(kdStrtoul("-4294967296", nullptr, 10), UINT_MAX);
    EXPECT_EQ(kdStrtoul("-18446744073709551615", nullptr, 10), UINT_MAX);
    EXPECT_EQ(kdStrtoul("-99999999999999999999999", nullptr, 10), UINT_MAX);
}

TEST(MathTest, InverseSquareRootAndRoundingHalfAwayFromZero) {
    EXPECT_FLOAT_EQ(kdInvsqrtf(4.0f), 0.5f);
    EXPECT_FLOAT_EQ(kdRoundf(2.5f), 3.0f);
    EXPECT_FLOAT_EQ(kdRoundf(-2.5f), -3.0f);
    EXPECT_FLOAT_EQ(kdAtan2f(1.0f, -1.0f), 3.0f * KD_PI_F / 4.0f);
}

}  // namespace
