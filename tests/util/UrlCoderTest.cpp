#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "util/UrlCoder.h"
#include "util/UrlEncoding.h"

using Util::UrlCoder;

TEST(UrlCoderTest, EncodesSpaceAsPlusAndAllButTheUnreservedSetAsUpperCaseHexAtAnyLength) {
    EXPECT_EQ("a+b%26c%3D%2F%3F%25%2B", UrlCoder::urlEncodeString("a b&c=/?%+"));
    EXPECT_EQ("%C3%A4%FF%0A", UrlCoder::urlEncodeString("\xC3\xA4\xFF\n"));
    const std::string unreserved = "azAZ09-_.!~*'()";
    EXPECT_EQ(unreserved, UrlCoder::urlEncodeString(unreserved));
    // Longer than the stack buffer once escaped.
    std::string expected;
    for (int i = 0; i < 100; ++i) {
        expected += "%26";
    }
    EXPECT_EQ(expected, UrlCoder::urlEncodeString(std::string(100, '&')));
}

TEST(UrlCoderTest, EncodeStopsAtAnEscapeThatDoesNotFit) {
    char out[6];
    EXPECT_EQ(2u, Util::UrlEncode("ab&", out, 5));
    EXPECT_STREQ("ab", out) << "an escape is never cut in half";
    EXPECT_EQ(1u, Util::UrlEncode("ab&", out, 2));
    EXPECT_STREQ("a", out);
    EXPECT_EQ(0u, Util::UrlEncode("ab&", out, 0));
    EXPECT_EQ(5u, Util::UrlEncode("ab&", out, 6));
    EXPECT_STREQ("ab%26", out);
}

TEST(UrlCoderTest, DecodesEscapesOfEitherCaseAndMakesBrokenOnesQuestionMarks) {
    EXPECT_EQ("a b&c/\xff\xab", UrlCoder::urlDecodeString("a+b%26c%2f%FF%aB"));
    EXPECT_EQ("?zz", UrlCoder::urlDecodeString("%zz"));
    EXPECT_EQ("?4g", UrlCoder::urlDecodeString("%4g"));
    EXPECT_EQ("a?", UrlCoder::urlDecodeString("a%"));
    EXPECT_EQ("a?F", UrlCoder::urlDecodeString("a%F"));
    EXPECT_EQ("?A", UrlCoder::urlDecodeString("%%41"));
}

TEST(UrlCoderTest, DecodedZeroByteIsCountedAndKept) {
    std::vector<char> out(8, 'x');
    EXPECT_EQ(3u, Util::UrlDecode("a%00b", out.data()));
    EXPECT_EQ(std::string("a\0b", 3), std::string(out.data(), 3));
    EXPECT_EQ('\0', out[3]);
    EXPECT_EQ(std::string("a\0b", 3), UrlCoder::urlDecodeString("a%00b"));
}

TEST(UrlCoderTest, EveryByteRoundTrips) {
    std::string all;
    for (int c = 1; c < 256; ++c) {
        all.push_back(static_cast<char>(c));
    }
    EXPECT_EQ(all, UrlCoder::urlDecodeString(UrlCoder::urlEncodeString(all)));
}
