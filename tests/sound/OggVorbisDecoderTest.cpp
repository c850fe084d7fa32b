#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstdio>
#include <vector>

#include "sound/OggVorbisDecoder.h"
#include "sound/VorbisTestData.h"
#include "support/PalTest.h"

using Sound::OggVorbisDecoder;
using Sound::SoundDataBuffer;

namespace {

SoundDataBuffer bufferOf(const std::vector<unsigned char>& bytes) {
    SoundDataBuffer buffer;
    buffer.data = bytes;
    return buffer;
}

std::vector<int16_t> samplesOf(const SoundDataBuffer& buffer) {
    std::vector<int16_t> samples(buffer.data.size() / 2);
    for (size_t i = 0; i < samples.size(); ++i) {
        samples[i] = static_cast<int16_t>(buffer.data[2 * i] | buffer.data[2 * i + 1] << 8);
    }
    return samples;
}

// Ogg's page checksum: CRC-32, polynomial 0x04c11db7, not reflected, zero start.
uint32_t oggCrc(const unsigned char* data, size_t size) {
    uint32_t crc = 0;
    for (size_t i = 0; i < size; ++i) {
        crc ^= static_cast<uint32_t>(data[i]) << 24;
        for (int bit = 0; bit < 8; ++bit) {
            crc = crc & 0x80000000u ? (crc << 1) ^ 0x04c11db7u : crc << 1;
        }
    }
    return crc;
}

// Rewrites the granule position of the file's last page, keeping it valid.
void setLastGranule(std::vector<unsigned char>& file, int64_t granule) {
    size_t last = 0;
    for (size_t at = 0; at + 27 <= file.size();) {
        last = at;
        size_t body = 0;
        for (int i = 0; i < file[at + 26]; ++i) {
            body += file[at + 27 + i];
        }
        at += 27 + file[at + 26] + body;
    }
    for (int i = 0; i < 8; ++i) {
        file[last + 6 + i] = static_cast<unsigned char>(static_cast<uint64_t>(granule) >> (8 * i));
    }
    for (int i = 0; i < 4; ++i) {
        file[last + 22 + i] = 0;
    }
    const uint32_t crc = oggCrc(file.data() + last, file.size() - last);
    for (int i = 0; i < 4; ++i) {
        file[last + 22 + i] = static_cast<unsigned char>(crc >> (8 * i));
    }
}

class OggVorbisDecoderTest : public PalTest {};

struct Layout {
    int channels;
    long rate;
    long samples;
};

class OggVorbisDecoderLayoutTest : public OggVorbisDecoderTest,
                                   public ::testing::WithParamInterface<Layout> {};

TEST_P(OggVorbisDecoderLayoutTest, DecodesEverySampleOfEveryChannel) {
    const Layout layout = GetParam();
    const SoundDataBuffer input = bufferOf(makeVorbisFile(layout.channels, layout.rate, layout.samples));
    SoundDataBuffer output;

    ASSERT_TRUE(OggVorbisDecoder(output, input).decode());

    ASSERT_EQ(output.data.size(), static_cast<size_t>(layout.samples * layout.channels * 2));
    // The 440 Hz tone survives: byte order and interleaving are right when the
    // first channel crosses zero twice per period.
    const std::vector<int16_t> samples = samplesOf(output);
    int crossings = 0;
    for (long i = 1; i < layout.samples; ++i) {
        crossings += (samples[(i - 1) * layout.channels] < 0) != (samples[i * layout.channels] < 0);
    }
    const double expected = 2.0 * 440.0 * layout.samples / layout.rate;
    EXPECT_NEAR(crossings, expected, expected * 0.02 + 2);
}

INSTANTIATE_TEST_SUITE_P(Layouts, OggVorbisDecoderLayoutTest,
                         ::testing::Values(Layout{1, 16000, 16000}, Layout{2, 44100, 44100 + 123},
                                           Layout{2, 22050, 5000}));

TEST_F(OggVorbisDecoderTest, ZeroSamplesDecodeToEmptyOutput) {
    const SoundDataBuffer input = bufferOf(makeVorbisFile(1, 16000, 0));
    SoundDataBuffer output = bufferOf({1, 2, 3});

    EXPECT_TRUE(OggVorbisDecoder(output, input).decode());
    EXPECT_TRUE(output.data.empty());
}

TEST_F(OggVorbisDecoderTest, NonVorbisInputLeavesOutputUntouched) {
    for (const std::vector<unsigned char>& bytes :
         {std::vector<unsigned char>{}, std::vector<unsigned char>(5000, 'x'),
          std::vector<unsigned char>{'O', 'g', 'g', 'S', 0, 2}}) {
        const SoundDataBuffer input = bufferOf(bytes);
        SoundDataBuffer output = bufferOf({7, 7});
        EXPECT_FALSE(OggVorbisDecoder(output, input).decode()) << bytes.size();
        EXPECT_EQ(output.data.size(), 2u);
    }
}

TEST_F(OggVorbisDecoderTest, TruncatedFileFailsWithEmptyOutput) {
    const std::vector<unsigned char> whole = makeVorbisFile(2, 44100, 3 * 44100);
    for (size_t keep : {whole.size() / 2, whole.size() - 100, whole.size() - 1}) {
        const SoundDataBuffer input =
            bufferOf(std::vector<unsigned char>(whole.begin(), whole.begin() + keep));
        SoundDataBuffer output = bufferOf({7, 7});
        EXPECT_FALSE(OggVorbisDecoder(output, input).decode()) << keep;
        EXPECT_TRUE(output.data.empty()) << keep;
    }
}

TEST_F(OggVorbisDecoderTest, FileCutBetweenPagesFailsAsTruncated) {
    const std::vector<unsigned char> whole = makeVorbisFile(2, 44100, 5 * 44100);
    std::vector<size_t> pageEnds;
    for (size_t at = 0; at + 27 <= whole.size();) {
        size_t body = 0;
        for (int i = 0; i < whole[at + 26]; ++i) {
            body += whole[at + 27 + i];
        }
        at += 27 + whole[at + 26] + body;
        pageEnds.push_back(at);
    }
    ASSERT_GT(pageEnds.size(), 4u);
    ASSERT_EQ(pageEnds.back(), whole.size());
    // From the end of the headers on, every cut still leaves a stream vorbisfile opens.
    for (size_t page = 2; page + 1 < pageEnds.size(); ++page) {
        const SoundDataBuffer input =
            bufferOf(std::vector<unsigned char>(whole.begin(), whole.begin() + pageEnds[page]));
        SoundDataBuffer output = bufferOf({7, 7});
        EXPECT_FALSE(OggVorbisDecoder(output, input).decode()) << "cut after page " << page;
        EXPECT_TRUE(output.data.empty()) << "cut after page " << page;
    }
    EXPECT_EQ(countLogLines("Ogg Vorbis: the file is truncated"), static_cast<int>(pageEnds.size()) - 3);
}

TEST_F(OggVorbisDecoderTest, DeclaredLengthBeyondTheSamplesFailsWithEmptyOutput) {
    for (int64_t granule : {int64_t{200000}, int64_t{1} << 32, int64_t{1} << 40, INT64_MAX / 2}) {
        // Several audio pages, so that the first one fixes where the stream starts.
        std::vector<unsigned char> file = makeVorbisFile(2, 44100, 3 * 44100);
        setLastGranule(file, granule);
        const SoundDataBuffer input = bufferOf(file);
        SoundDataBuffer output;
        EXPECT_FALSE(OggVorbisDecoder(output, input).decode()) << granule;
        EXPECT_TRUE(output.data.empty()) << granule;
    }
}

TEST_F(OggVorbisDecoderTest, SeekCallbackStaysWithinTheSource) {
    const SoundDataBuffer input = bufferOf(std::vector<unsigned char>(100, 0));
    SoundDataBuffer output;
    OggVorbisDecoder decoder(output, input);
    decoder.decode();  // takes the source
    struct Case {
        ogg_int64_t offset;
        int whence;
        int result;
        long position;
    };
    const Case cases[] = {{0, SEEK_END, 0, 100}, {-10, SEEK_END, 0, 90},  {5, SEEK_CUR, 0, 95},
                          {6, SEEK_CUR, -1, 95}, {-96, SEEK_CUR, -1, 95}, {101, SEEK_SET, -1, 95},
                          {3, SEEK_SET, 0, 3},   {0, 7, -1, 3},           {INT64_MAX, SEEK_END, -1, 3}};
    for (const Case& c : cases) {
        EXPECT_EQ(OggVorbisDecoder::seekOgg(&decoder, c.offset, c.whence), c.result) << c.offset;
        EXPECT_EQ(OggVorbisDecoder::tellOgg(&decoder), c.position) << c.offset;
    }
    unsigned char bytes[200];
    EXPECT_EQ(OggVorbisDecoder::readOgg(bytes, 1, 200, &decoder), 97u);
    EXPECT_EQ(OggVorbisDecoder::readOgg(bytes, 1, 200, &decoder), 0u);
}

}  // namespace
