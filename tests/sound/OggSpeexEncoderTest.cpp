#include <gtest/gtest.h>
#include <ogg/ogg.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "sound/OggSpeexEncoder.h"
#include "sound/SpeexCFG.h"
#include "support/PalTest.h"

using Sound::OggSpeexEncoder;
using Sound::SoundDataBuffer;
using Sound::SoundDataInfo;
using Sound::SpeexCFG;

namespace {

struct Packet {
    std::vector<unsigned char> bytes;
    long long granule;
    bool endOfStream;
};

// Reads the packets back with libogg, which also checks every page's checksum.
std::vector<Packet> packetsOf(const std::vector<unsigned char>& stream) {
    std::vector<Packet> packets;
    ogg_sync_state sync;
    ogg_sync_init(&sync);
    char* buffer = ogg_sync_buffer(&sync, static_cast<long>(stream.size()));
    std::memcpy(buffer, stream.data(), stream.size());
    ogg_sync_wrote(&sync, static_cast<long>(stream.size()));
    ogg_stream_state state;
    bool started = false;
    ogg_page page;
    while (ogg_sync_pageout(&sync, &page) == 1) {
        if (!started) {
            ogg_stream_init(&state, ogg_page_serialno(&page));
            started = true;
        }
        ogg_stream_pagein(&state, &page);
        ogg_packet packet;
        while (ogg_stream_packetout(&state, &packet) == 1) {
            packets.push_back({std::vector<unsigned char>(packet.packet, packet.packet + packet.bytes),
                               packet.granulepos, packet.e_o_s != 0});
        }
    }
    if (started) {
        ogg_stream_clear(&state);
    }
    ogg_sync_clear(&sync);
    return packets;
}

int32_t int32At(const std::vector<unsigned char>& bytes, size_t at) {
    return static_cast<int32_t>(bytes[at] | bytes[at + 1] << 8 | bytes[at + 2] << 16 |
                                static_cast<uint32_t>(bytes[at + 3]) << 24);
}

// frequency Hz sine of samples samples, 16-bit little-endian or 8-bit signed.
SoundDataBuffer tone(int rate, int samples, double frequency, int sampleSize = 2) {
    SoundDataBuffer buffer;
    buffer.info = SoundDataInfo(SoundDataInfo::NONE, 1, rate, sampleSize, samples);
    for (int i = 0; i < samples; ++i) {
        const double value = 0.5 * std::sin(2.0 * M_PI * frequency * i / rate);
        if (sampleSize == 2) {
            const int16_t sample = static_cast<int16_t>(value * 32767);
            buffer.data.push_back(static_cast<unsigned char>(sample & 0xff));
            buffer.data.push_back(static_cast<unsigned char>((sample >> 8) & 0xff));
        } else {
            buffer.data.push_back(static_cast<unsigned char>(static_cast<signed char>(value * 127)));
        }
    }
    return buffer;
}

class OggSpeexEncoderTest : public PalTest {
protected:
    void SetUp() override {
        PalTest::SetUp();
        resetSettings();
    }
    void TearDown() override {
        resetSettings();
        PalTest::TearDown();
    }
    static void resetSettings() {
        SpeexCFG::quality = -1;
        SpeexCFG::bitRate = -1;
        SpeexCFG::numFramesPerPacket = 1;
        SpeexCFG::vbrEnabled = false;
        SpeexCFG::vbrMax = 0;
        SpeexCFG::abrEnabled = false;
        SpeexCFG::vadEnabled = false;
        SpeexCFG::dtxEnabled = false;
    }
};

TEST_F(OggSpeexEncoderTest, OneWholeFrameMakesOnePacketAndLeftoverBytesWait) {
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 16000, 2, -1), 8);
    ASSERT_EQ(encoder.getFrameSize(), 320);
    SoundDataBuffer input = tone(16000, 320 + 50, 440);  // 100 bytes beyond the frame

    encoder.write(input);
    EXPECT_EQ(encoder.getPacketCount(), 3);  // two headers, one frame
    encoder.closeWrite();
    EXPECT_EQ(encoder.getPacketCount(), 3);

    const boost::shared_ptr<SoundDataBuffer> stream = encoder.read(-1);
    EXPECT_EQ(stream->info.getCodec(), SoundDataInfo::OGG_SPEEX);
    EXPECT_EQ(stream->info.getSampleCount(), -1);
    ASSERT_GE(stream->data.size(), 4u);
    EXPECT_EQ(std::string(stream->data.begin(), stream->data.begin() + 4), "OggS");
    const std::vector<Packet> packets = packetsOf(stream->data);
    ASSERT_EQ(packets.size(), 3u);
    EXPECT_EQ(packets[2].granule, 320 - encoder.getLookahead());
    EXPECT_TRUE(packets[2].endOfStream);
    EXPECT_TRUE(encoder.read(-1)->data.empty());
}

TEST_F(OggSpeexEncoderTest, ReadHandsOutTheStreamInPieces) {
    OggSpeexEncoder whole(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 5);
    const std::vector<unsigned char> expected = Sound::encode(&whole, tone(8000, 8000, 300))->data;
    OggSpeexEncoder pieces(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 5);
    pieces.write(tone(8000, 8000, 300));
    pieces.closeWrite();
    std::vector<unsigned char> joined;
    for (std::vector<unsigned char> piece = pieces.read(100)->data; !piece.empty();
         piece = pieces.read(100)->data) {
        EXPECT_LE(piece.size(), 100u);
        joined.insert(joined.end(), piece.begin(), piece.end());
    }
    // Only the random serial numbers (bytes 14..17 of each page) and the checksums differ.
    EXPECT_EQ(joined.size(), expected.size());
    EXPECT_EQ(packetsOf(joined).size(), packetsOf(expected).size());
}

TEST_F(OggSpeexEncoderTest, HeaderAndCommentPacketsHoldTheStreamDescription) {
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 16000, 2, -1), 8);
    encoder.closeWrite();
    const std::vector<Packet> packets = packetsOf(encoder.read(-1)->data);
    ASSERT_EQ(packets.size(), 3u);  // and the silent frame that ends the stream

    const std::vector<unsigned char>& header = packets[0].bytes;
    ASSERT_EQ(header.size(), 80u);
    EXPECT_EQ(std::string(header.begin(), header.begin() + 8), "Speex   ");
    EXPECT_EQ(int32At(header, 32), 80);     // header size
    EXPECT_EQ(int32At(header, 36), 16000);  // rate
    EXPECT_EQ(int32At(header, 40), 1);      // wideband
    EXPECT_EQ(int32At(header, 48), 1);      // channels
    EXPECT_EQ(int32At(header, 56), 320);    // frame size
    EXPECT_EQ(int32At(header, 60), 0);      // no VBR
    EXPECT_EQ(int32At(header, 64), 1);      // frames per packet
    EXPECT_EQ(packets[0].granule, 0);

    const char* version = "";
    speex_lib_ctl(SPEEX_LIB_GET_VERSION_STRING, &version);
    const std::string vendor = std::string("Encoded with Speex ") + version;
    std::vector<unsigned char> expected;
    auto put32 = [&expected](uint32_t value) {
        for (int i = 0; i < 4; ++i) {
            expected.push_back(static_cast<unsigned char>(value >> (8 * i)));
        }
    };
    auto putText = [&](const std::string& text) {
        put32(static_cast<uint32_t>(text.size()));
        expected.insert(expected.end(), text.begin(), text.end());
    };
    putText(vendor);
    put32(2);
    putText("author=VoxiumKit");
    putText("title=Speech Record");
    EXPECT_EQ(packets[1].bytes, expected);
    EXPECT_EQ(packets[1].granule, 0);
}

TEST_F(OggSpeexEncoderTest, GranulesCountSamplesPerPacketAndTheLastEndsTheStream) {
    SpeexCFG::numFramesPerPacket = 3;
    // Small pages, so that many packets end a page and carry their granule.
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 4, 1);
    const boost::shared_ptr<SoundDataBuffer> stream = Sound::encode(&encoder, tone(8000, 160 * 40 + 20, 500));
    const std::vector<Packet> packets = packetsOf(stream->data);
    ASSERT_EQ(packets.size(), 2u + 14u);  // 13 packets of 3 frames, the 40th frame alone
    EXPECT_EQ(int32At(packets[0].bytes, 64), 3);
    int granules = 0;
    for (size_t i = 2; i < packets.size(); ++i) {
        const long long frames = std::min<long long>(3 * static_cast<long long>(i - 1), 40);
        if (packets[i].granule != -1) {
            EXPECT_EQ(packets[i].granule, frames * 160 - encoder.getLookahead()) << i;
            ++granules;
        }
        EXPECT_EQ(packets[i].endOfStream, i + 1 == packets.size()) << i;
    }
    EXPECT_GE(granules, 3);
    EXPECT_EQ(packets.back().granule, 40 * 160 - encoder.getLookahead());
}

struct ModeCase {
    int rate;
    int frameSize;
    const char* modeName;
};

class OggSpeexEncoderModeTest : public OggSpeexEncoderTest, public ::testing::WithParamInterface<ModeCase> {};

TEST_P(OggSpeexEncoderModeTest, RateChoosesTheSpeexMode) {
    const ModeCase mode = GetParam();
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, mode.rate, 2, -1), 6);
    EXPECT_TRUE(encoder.isInitialized());
    EXPECT_EQ(encoder.getFrameSize(), mode.frameSize);
    EXPECT_EQ(countLogLines("Encoding " + std::to_string(mode.rate) + " Hz audio using " + mode.modeName), 1);
    const std::vector<Packet> packets =
        packetsOf(Sound::encode(&encoder, tone(mode.rate, mode.rate, 440))->data);
    EXPECT_EQ(packets.size(), 2u + mode.rate / mode.frameSize);
}

INSTANTIATE_TEST_SUITE_P(Modes, OggSpeexEncoderModeTest,
                         ::testing::Values(ModeCase{8000, 160, "narrowband mode"},
                                           ModeCase{16000, 320, "wideband (sub-band CELP) mode"},
                                           ModeCase{32000, 640, "ultra-wideband (sub-band CELP) mode"}));

TEST_F(OggSpeexEncoderTest, UnsupportedRateMakesAnEncoderThatWritesNothing) {
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 44100, 2, -1), 6);
    expectAssertion("false && \"Unsupported bit rate.\"");
    EXPECT_FALSE(encoder.isInitialized());
    EXPECT_TRUE(Sound::encode(&encoder, tone(44100, 5000, 440))->data.empty());
}

TEST_F(OggSpeexEncoderTest, NoChannelsOrNoWholeSampleMakesAnEncoderThatWritesNothing) {
    struct Case {
        int channels;
        int sampleSize;
        const char* assertion;
    };
    for (const Case c : {Case{0, 2, "false && \"Unsupported channel count.\""},
                         Case{3, 2, "false && \"Unsupported channel count.\""},
                         Case{1, 0, "false && \"Unsupported sample size.\""},
                         Case{1, 4, "false && \"Unsupported sample size.\""}}) {
        const SoundDataInfo info(SoundDataInfo::NONE, c.channels, 8000, c.sampleSize, -1);
        OggSpeexEncoder encoder(info, 6);
        expectAssertion(c.assertion);
        EXPECT_FALSE(encoder.isInitialized());
        SoundDataBuffer input;
        input.info = info;
        input.data.assign(4000, 1);
        EXPECT_TRUE(Sound::encode(&encoder, input)->data.empty());
    }
}

TEST_F(OggSpeexEncoderTest, BadArgumentsAssert) {
    SoundDataInfo encoded(SoundDataInfo::OGG_SPEEX, 1, 8000, 2, -1);
    OggSpeexEncoder wrongCodec(encoded, 11);
    expectAssertion("anInfo.getCodec() == SoundDataInfo::NONE");
    expectAssertion("0 <= aQuality && aQuality <= 10");
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 3);
    encoder.write(tone(16000, 10, 440));
    expectAssertion("aBuffer.info.getSampleRate() == info.getSampleRate()");
}

struct WarningCase {
    bool vbr, abr, vad, dtx;
    int bitRate;
    const char* warning;  // null: none
};

class OggSpeexEncoderWarningTest : public OggSpeexEncoderTest,
                                   public ::testing::WithParamInterface<WarningCase> {};

TEST_P(OggSpeexEncoderWarningTest, OptionsWarnAsTheReferenceEncoderDoes) {
    const WarningCase c = GetParam();
    SpeexCFG::vbrEnabled = c.vbr;
    SpeexCFG::abrEnabled = c.abr;
    SpeexCFG::vadEnabled = c.vad;
    SpeexCFG::dtxEnabled = c.dtx;
    SpeexCFG::bitRate = c.bitRate;
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 5);
    EXPECT_EQ(countLogLines("Warning:"), c.warning ? 1 : 0);
    if (c.warning) {
        EXPECT_EQ(countLogLines(c.warning), 1);
    }
    // Every combination still encodes a decodable stream.
    EXPECT_EQ(packetsOf(Sound::encode(&encoder, tone(8000, 1600, 440))->data).size(), 12u);
}

INSTANTIATE_TEST_SUITE_P(
    Options, OggSpeexEncoderWarningTest,
    ::testing::Values(
        WarningCase{false, false, false, false, -1, nullptr},
        WarningCase{true, false, false, false, 8000, "Warning: bitrate option is overriding quality"},
        WarningCase{false, false, false, false, 8000, nullptr},
        WarningCase{false, false, false, true, -1, "Warning: dtx is useless without vad, vbr or abr"},
        WarningCase{false, false, true, true, -1, nullptr},
        WarningCase{true, false, true, false, -1, "Warning: vad is already implied by vbr or abr"},
        WarningCase{false, true, true, false, -1, "Warning: vad is already implied by vbr or abr"}));

TEST_F(OggSpeexEncoderTest, AverageBitRateAimsAtTheQualitysRateNotOneBitPerSecond) {
    OggSpeexEncoder plain(SoundDataInfo(SoundDataInfo::NONE, 1, 16000, 2, -1), 8);
    const size_t plainSize = Sound::encode(&plain, tone(16000, 32000, 440))->data.size();
    SpeexCFG::abrEnabled = true;
    OggSpeexEncoder average(SoundDataInfo(SoundDataInfo::NONE, 1, 16000, 2, -1), 8);
    const size_t averageSize = Sound::encode(&average, tone(16000, 32000, 440))->data.size();
    EXPECT_GT(averageSize, plainSize / 2);
}

// speexdec (Debian's speex package) is an independent decoder of our streams.
class SpeexdecTest : public OggSpeexEncoderTest, public ::testing::WithParamInterface<int> {};

TEST_P(SpeexdecTest, StandardDecoderKeepsLengthAndPitch) {
    const int sampleSize = GetParam();
    const int rate = 16000;
    const int samples = rate * 2 + 77;
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, rate, sampleSize, -1), 8);
    const boost::shared_ptr<SoundDataBuffer> stream =
        Sound::encode(&encoder, tone(rate, samples, 500, sampleSize));
    std::filesystem::create_directories(hostPath("/tmp"));
    const std::string spx = hostPath("/tmp") + "/speech.spx";
    const std::string wav = hostPath("/tmp") + "/speech.wav";
    std::ofstream(spx, std::ios::binary)
        .write(reinterpret_cast<const char*>(stream->data.data()),
               static_cast<std::streamsize>(stream->data.size()));
    const std::string command = "speexdec --quiet '" + spx + "' '" + wav + "' 2>/dev/null";
    ASSERT_EQ(std::system(command.c_str()), 0) << "speexdec must be installed (scripts/install-deps.sh)";

    std::ifstream in(wav, std::ios::binary);
    const std::vector<unsigned char> file((std::istreambuf_iterator<char>(in)),
                                          std::istreambuf_iterator<char>());
    ASSERT_GT(file.size(), 44u);
    EXPECT_EQ(int32At(file, 24), rate);
    std::vector<int16_t> pcm((file.size() - 44) / 2);
    std::memcpy(pcm.data(), file.data() + 44, pcm.size() * 2);
    // The trailing part frame is dropped; speexdec stops at the last granule
    // and drops its own decoder's look-ahead at the start.
    void* decoder = speex_decoder_init(speex_lib_get_mode(SPEEX_MODEID_WB));
    int decoderLookahead = 0;
    speex_decoder_ctl(decoder, SPEEX_GET_LOOKAHEAD, &decoderLookahead);
    speex_decoder_destroy(decoder);
    const int whole = samples / encoder.getFrameSize() * encoder.getFrameSize();
    EXPECT_EQ(static_cast<int>(pcm.size()), whole - encoder.getLookahead() - decoderLookahead);
    int crossings = 0;
    for (size_t i = 1; i < pcm.size(); ++i) {
        crossings += (pcm[i - 1] < 0) != (pcm[i] < 0);
    }
    const double expected = 2.0 * 500 * pcm.size() / rate;
    EXPECT_NEAR(crossings, expected, expected * 0.05);
}

INSTANTIATE_TEST_SUITE_P(SampleSizes, SpeexdecTest, ::testing::Values(2, 1));

// A recording stopped before its first slice: no input, or less than one frame.
class ShortRecordingTest : public OggSpeexEncoderTest, public ::testing::WithParamInterface<int> {
protected:
    // Runs tool on the stream saved as a file, followed by arguments; its exit status, and what
    // it printed in output.
    int runOn(const std::vector<unsigned char>& stream, const std::string& tool, const std::string& arguments,
              std::string& output) {
        std::filesystem::create_directories(hostPath("/tmp"));
        const std::string spx = hostPath("/tmp") + "/short.spx";
        const std::string log = hostPath("/tmp") + "/tool.log";
        std::ofstream(spx, std::ios::binary)
            .write(reinterpret_cast<const char*>(stream.data()), static_cast<std::streamsize>(stream.size()));
        const int status =
            std::system((tool + " '" + spx + "' " + arguments + " >'" + log + "' 2>&1").c_str());
        std::ifstream in(log);
        output.assign(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
        return status;
    }
};

TEST_P(ShortRecordingTest, EndsWithOnePaddedFrameFlaggedEndOfStream) {
    const int samples = GetParam();
    OggSpeexEncoder encoder(SoundDataInfo(SoundDataInfo::NONE, 1, 8000, 2, -1), 5);
    const std::vector<unsigned char> stream = Sound::encode(&encoder, tone(8000, samples, 440))->data;

    const std::vector<Packet> packets = packetsOf(stream);
    ASSERT_EQ(packets.size(), 3u);
    EXPECT_TRUE(packets[2].endOfStream);
    EXPECT_EQ(packets[2].granule, std::min(160 - encoder.getLookahead(), samples));

    // Debian's tools read it as a complete stream.
    std::string output;
    ASSERT_EQ(runOn(stream, "ogginfo", "", output), 0) << output;
    EXPECT_EQ(output.find("WARNING"), std::string::npos) << output;
    EXPECT_EQ(runOn(stream, "speexdec --quiet", "'" + hostPath("/tmp") + "/short.wav'", output), 0) << output;
}

INSTANTIATE_TEST_SUITE_P(Lengths, ShortRecordingTest, ::testing::Values(0, 1, 100, 159));

}  // namespace
