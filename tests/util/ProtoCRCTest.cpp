#include <gtest/gtest.h>

#include <string>

#include "util/ProtoCRC.h"

using Util::ProtoCRC;

namespace {

const int kCheckCrc = static_cast<int>(0xCBF43926u);

std::string xored(const std::string& text, const std::string& key) {
    std::string out = text;
    for (size_t i = 0; i < out.size(); ++i) {
        out[i] = static_cast<char>(out[i] ^ key[i % key.size()]);
    }
    return out;
}

}  // namespace

TEST(ProtoCRCTest, ChecksumIsTheCrc32OfTheBufferAfterTheRepeatedKeyXor) {
    // Scrambled with the key, so the XOR inside turns it back into the check string.
    std::string buffer = xored("123456789", "key");
    EXPECT_EQ(kCheckCrc, ProtoCRC::calcBufferCRC(&buffer[0], 9, "key"));
    EXPECT_EQ("123456789", buffer) << "the caller's buffer is left XORed";

    const std::string plain(1000, 'A');
    std::string longBuffer = plain;
    ProtoCRC::calcBufferCRC(&longBuffer[0], static_cast<int>(longBuffer.size()), "ab");
    EXPECT_EQ(xored(plain, "ab"), longBuffer);
}

TEST(ProtoCRCTest, EmptyInputsAreHarmless) {
    std::string buffer = "123456789";
    EXPECT_EQ(0, ProtoCRC::calcBufferCRC(&buffer[0], 0, "key"));
    EXPECT_EQ(kCheckCrc, ProtoCRC::calcBufferCRC(&buffer[0], 9, ""));
    EXPECT_EQ(kCheckCrc, ProtoCRC::calcBufferCRC(&buffer[0], 9, nullptr));
    EXPECT_EQ("123456789", buffer);
}
