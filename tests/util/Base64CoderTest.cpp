#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "util/Base64Coder.h"

using Util::Base64Coder;

namespace {

std::string decoded(const std::string& text) {
    std::vector<unsigned char> out;
    Base64Coder::decode(text, out);
    return std::string(out.begin(), out.end());
}

}  // namespace

TEST(Base64CoderTest, EncodesTheRfc4648Vectors) {
    const char* const vectors[][2] = {{"", ""},
                                      {"f", "Zg=="},
                                      {"fo", "Zm8="},
                                      {"foo", "Zm9v"},
                                      {"foob", "Zm9vYg=="},
                                      {"fooba", "Zm9vYmE="},
                                      {"foobar", "Zm9vYmFy"}};
    for (const auto& vector : vectors) {
        std::string out = "stale";
        Base64Coder::encode(std::string(vector[0]), out);
        EXPECT_EQ(vector[1], out);
        EXPECT_EQ(vector[0], decoded(vector[1]));
    }
}

TEST(Base64CoderTest, AllByteValuesRoundTripAtEveryLengthModThree) {
    for (size_t length = 0; length < 300; ++length) {
        std::vector<unsigned char> bytes(length);
        for (size_t i = 0; i < length; ++i) {
            bytes[i] = static_cast<unsigned char>(i * 37 + length);
        }
        std::string text;
        Base64Coder::encode(bytes, text);
        ASSERT_EQ((length + 2) / 3 * 4, text.size());
        std::vector<unsigned char> back = {1, 2, 3};
        Base64Coder::decode(text, back);
        ASSERT_EQ(bytes, back) << "length " << length;
    }
}

TEST(Base64CoderTest, DecodingSkipsWhitespaceStopsAtATagAndDropsAnIncompleteLastGroup) {
    EXPECT_EQ("foobar", decoded(" Zm9v\r\nYm\tFy \n"));
    EXPECT_EQ("fo", decoded("Zm\n8="));
    EXPECT_EQ("foo", decoded("Zm9v</data><other>Zm9v"));
    EXPECT_EQ("", decoded("<Zm9v"));
    EXPECT_EQ("foo", decoded("Zm9vYm"));
    EXPECT_EQ("", decoded("Zg"));
}
