// Arbitrary bytes reach these parsers from files and servers. Each gets thousands of random and
// mutated inputs from a fixed seed; none may crash, read out of bounds (run under
// AddressSanitizer to see it) or report an assertion, and failures must leave clean results.
#include <tinyxml.h>

#include <cstring>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "io/ByteArrayOutputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "support/PalTest.h"
#include "util/Base64Coder.h"
#include "util/TestSettings.h"
#include "util/UrlEncoding.h"
#include "util/XmlUtils.h"

namespace {

typedef std::vector<unsigned char> Bytes;

const int kInputsPerTarget = 3000;

Bytes bytesOf(const std::string& text) {
    return Bytes(text.begin(), text.end());
}

Bytes gzipped(const Bytes& bytes) {
    IO::ByteArrayOutputStream out;
    {
        IO::Zip::GzipOutputStream gzip(&out);
        gzip.write(bytes.data(), static_cast<int>(bytes.size()));
    }
    return out.getData();
}

class UntrustedInputTest : public PalTest {
protected:
    // Even inputs are random bytes, odd ones are seeds with a few mutations, which get past the
    // first checks of a parser and into its depths.
    Bytes input(int index, const std::vector<Bytes>& seeds) {
        if (index % 2 == 0) {
            return randomBytes();
        }
        return mutated(seeds[index / 2 % seeds.size()]);
    }

    int below(size_t bound) { return bound == 0 ? 0 : static_cast<int>(rng() % bound); }

    unsigned char interestingByte() {
        static const unsigned char kBytes[] = {0,   '%',  '<',  '>',  '=',  '/', '+',
                                               '&', 0x1f, 0x8b, 0xef, 0xff, 0x80};
        return below(2) == 0 ? kBytes[below(sizeof(kBytes))] : static_cast<unsigned char>(rng());
    }

    Bytes randomBytes() {
        Bytes bytes(below(300));
        for (unsigned char& byte : bytes) {
            byte = interestingByte();
        }
        return bytes;
    }

    Bytes mutated(Bytes bytes) {
        const int mutations = 1 + below(4);
        for (int i = 0; i < mutations; ++i) {
            const int at = below(bytes.size() + 1);
            switch (below(5)) {
                case 0:
                    if (!bytes.empty()) {
                        bytes[below(bytes.size())] = interestingByte();
                    }
                    break;
                case 1:
                    bytes.resize(at);
                    break;
                case 2:
                    bytes.insert(bytes.begin() + at, interestingByte());
                    break;
                case 3:
                    bytes.erase(bytes.begin() + at,
                                bytes.begin() + std::min(bytes.size(), size_t(at + below(16))));
                    break;
                default: {
                    const int length = below(bytes.size() - at + 1);
                    Bytes slice(bytes.begin() + at, bytes.begin() + at + length);
                    bytes.insert(bytes.begin() + below(bytes.size() + 1), slice.begin(), slice.end());
                }
            }
        }
        return bytes;
    }

    std::vector<Bytes> xmlSeeds() {
        return {bytesOf("<?xml version=\"1.0\" encoding=\"UTF-8\"?><startup><uuid>abc</uuid>"
                        "<query_hosts><host name=\"tiles\" value=\"http://t/\"/></query_hosts></startup>"),
                bytesOf("\xef\xbb\xbf<a b='1' c=\"&amp;&#x41;&lt;\"><!-- c --><![CDATA[x]]><d/>text</a>"),
                bytesOf("<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?><l><e>\xe4</e><e>&#228;</e></l>")};
    }

    std::mt19937 rng{20240611u};
};

}  // namespace

TEST_F(UntrustedInputTest, UrlDecodeStaysWithinItsBuffers) {
    const std::vector<Bytes> seeds = {bytesOf("a+b%26c%2f%FF%aB"), bytesOf("%%%4g%z%"), bytesOf("x%0")};
    for (int i = 0; i < kInputsPerTarget; ++i) {
        Bytes bytes = input(i, seeds);
        const std::string text(bytes.begin(), bytes.end());
        // Exactly the documented size, on the heap, so that one byte too many is caught.
        std::vector<char> out(std::strlen(text.c_str()) + 1);
        const unsigned int written = Util::UrlDecode(text.c_str(), out.data());
        ASSERT_LT(written, out.size());
        ASSERT_EQ('\0', out[written]);
    }
}

TEST_F(UntrustedInputTest, Base64DecodeNeverYieldsMoreThanItsInputAllows) {
    const std::vector<Bytes> seeds = {bytesOf("Zm9vYmFy"), bytesOf("Zm9v\r\nYg==<x>"), bytesOf("QQ==QUI=")};
    for (int i = 0; i < kInputsPerTarget; ++i) {
        Bytes bytes = input(i, seeds);
        std::vector<unsigned char> out;
        Util::Base64Coder::decode(std::string(bytes.begin(), bytes.end()), out);
        ASSERT_LE(out.size(), bytes.size() / 4 * 3);
    }
}

TEST_F(UntrustedInputTest, XmlLoadOfPlainOrGzippedBytesFailsCleanly) {
    for (bool compressed : {false, true}) {
        std::vector<Bytes> seeds = xmlSeeds();
        for (Bytes& seed : seeds) {
            seed = compressed ? gzipped(seed) : seed;
        }
        int loaded = 0;
        for (int i = 0; i < kInputsPerTarget; ++i) {
            TiXmlDocument doc;
            loaded += Util::XmlUtils::load(input(i, seeds), compressed, doc) ? 1 : 0;
        }
        EXPECT_GT(loaded, 0) << "mutations should leave some documents whole";
    }
}

TEST_F(UntrustedInputTest, SettingsLoadFailsWithTheObjectReset) {
    for (bool compressed : {false, true}) {
        TestSettings original(compressed);
        original.zoom = 12;
        original.title = "seed title";
        original.points = {1.0f, 2.0f, 3.0f};
        original.save();
        std::ifstream saved(hostPath("/data/settings.bin"), std::ios::binary);
        const std::vector<Bytes> seeds = {Bytes(std::istreambuf_iterator<char>(saved), {})};

        int loaded = 0;
        for (int i = 0; i < kInputsPerTarget / 2; ++i) {
            const Bytes bytes = input(i, seeds);
            // A fresh file rather than a truncated one: ext4 flushes a file truncated and
            // rewritten when it is closed, which would make this loop wait on the disk.
            std::filesystem::remove(hostPath("/data/settings.bin"));
            std::ofstream(hostPath("/data/settings.bin"), std::ios::binary)
                .write(reinterpret_cast<const char*>(bytes.data()), bytes.size());
            TestSettings settings(compressed);
            settings.zoom = 99;
            if (settings.load()) {
                ++loaded;
                continue;
            }
            ASSERT_EQ(1, settings.zoom) << "input " << i;
            ASSERT_EQ("default", settings.title) << "input " << i;
            ASSERT_TRUE(settings.points.empty()) << "input " << i;
        }
        EXPECT_GT(loaded, 0);
    }
}
