#include "sound/OggSpeexEncoder.h"

#include <KD/kd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>

#include "sound/SpeexCFG.h"
#include "util/Logger.h"

namespace Sound {

namespace {

constexpr int kMaxPacketBytes = 2000;

void appendLittleEndian32(std::vector<unsigned char>& out, unsigned int value) {
    for (int i = 0; i < 4; ++i) {
        out.push_back(static_cast<unsigned char>(value >> (8 * i)));
    }
}

void appendText(std::vector<unsigned char>& out, const std::string& text) {
    appendLittleEndian32(out, static_cast<unsigned int>(text.size()));
    out.insert(out.end(), text.begin(), text.end());
}

std::vector<unsigned char> commentPacket() {
    const char* version = "";
    speex_lib_ctl(SPEEX_LIB_GET_VERSION_STRING, &version);
    std::vector<unsigned char> packet;
    appendText(packet, std::string("Encoded with Speex ") + version);
    appendLittleEndian32(packet, 2);
    appendText(packet, "author=VoxiumKit");
    appendText(packet, "title=Speech Record");
    return packet;
}

}  // namespace

OggSpeexEncoder::OggSpeexEncoder(const SoundDataInfo& anInfo, int aQuality, unsigned int pageFillBytes)
    : info(anInfo), quality(aQuality), pageFillBytes(pageFillBytes) {
    KD_ASSERT(anInfo.getCodec() == SoundDataInfo::NONE);
    KD_ASSERT(0 <= aQuality && aQuality <= 10);
    std::memset(&stream, 0, sizeof(stream));
    std::memset(&header, 0, sizeof(header));
    std::memset(&bits, 0, sizeof(bits));
    initialized = init();
    if (initialized) {
        writeHeader();
    }
}

OggSpeexEncoder::~OggSpeexEncoder() {
    if (initialized) {
        speex_bits_destroy(&bits);
        speex_encoder_destroy(state);
        ogg_stream_clear(&stream);
    }
}

bool OggSpeexEncoder::init() {
    // Without whole samples of one or two channels no frame could ever fill.
    if (info.getChannelCount() != 1 && info.getChannelCount() != 2) {
        KD_ASSERT(false && "Unsupported channel count.");
        return false;
    }
    if (info.getSampleSize() != 1 && info.getSampleSize() != 2) {
        KD_ASSERT(false && "Unsupported sample size.");
        return false;
    }
    const SpeexMode* mode = nullptr;
    switch (info.getSampleRate()) {
        case 8000:
            mode = speex_lib_get_mode(SPEEX_MODEID_NB);
            break;
        case 16000:
            mode = speex_lib_get_mode(SPEEX_MODEID_WB);
            break;
        case 32000:
            mode = speex_lib_get_mode(SPEEX_MODEID_UWB);
            break;
        default:
            KD_ASSERT(false && "Unsupported bit rate.");
            return false;
    }
    std::srand(static_cast<unsigned int>(kdTime(nullptr)));
    if (ogg_stream_init(&stream, std::rand()) != 0) {
        KD_ASSERT(false && "Failed to initialize OGG stream.");
        return false;
    }
    speex_init_header(&header, info.getSampleRate(), 1, mode);
    // A header announcing -1 frames per packet would make decoders read no
    // frame at all; such packets hold one frame each.
    framesPerPacket = SpeexCFG::numFramesPerPacket;
    header.nb_channels = info.getChannelCount();
    header.vbr = SpeexCFG::vbrEnabled;
    header.frames_per_packet = std::max(1, framesPerPacket);
    Logger::log(Logger::Info, "Encoding %d Hz audio using %s mode\n", info.getSampleRate(), mode->modeName);

    state = speex_encoder_init(mode);
    if (state == nullptr) {
        ogg_stream_clear(&stream);
        return false;
    }
    speex_encoder_ctl(state, SPEEX_GET_FRAME_SIZE, &frameSize);
    configureEncoder();
    speex_encoder_ctl(state, SPEEX_GET_LOOKAHEAD, &lookahead);
    speex_bits_init(&bits);
    return true;
}

void OggSpeexEncoder::configureEncoder() {
    spx_int32_t complexity = SpeexCFG::complexity;
    spx_int32_t rate = info.getSampleRate();
    speex_encoder_ctl(state, SPEEX_SET_COMPLEXITY, &complexity);
    speex_encoder_ctl(state, SPEEX_SET_SAMPLING_RATE, &rate);

    const int effectiveQuality = SpeexCFG::quality >= 0 ? SpeexCFG::quality : quality;
    if (effectiveQuality >= 0) {
        if (SpeexCFG::vbrEnabled) {
            if (SpeexCFG::vbrMax > 0) {
                spx_int32_t vbrMax = SpeexCFG::vbrMax;
                speex_encoder_ctl(state, SPEEX_SET_VBR_MAX_BITRATE, &vbrMax);
            }
            float vbrQuality = static_cast<float>(effectiveQuality);
            speex_encoder_ctl(state, SPEEX_SET_VBR_QUALITY, &vbrQuality);
        } else {
            spx_int32_t value = effectiveQuality;
            speex_encoder_ctl(state, SPEEX_SET_QUALITY, &value);
        }
    }
    if (SpeexCFG::bitRate >= 0) {
        if (effectiveQuality >= 0 && SpeexCFG::vbrEnabled) {
            Logger::log(Logger::Info, "Warning: bitrate option is overriding quality\n");
        }
        spx_int32_t bitRate = SpeexCFG::bitRate;
        speex_encoder_ctl(state, SPEEX_SET_BITRATE, &bitRate);
    }
    spx_int32_t on = 1;
    if (SpeexCFG::vbrEnabled) {
        speex_encoder_ctl(state, SPEEX_SET_VBR, &on);
    } else if (SpeexCFG::vadEnabled) {
        speex_encoder_ctl(state, SPEEX_SET_VAD, &on);
    }
    if (SpeexCFG::dtxEnabled) {
        speex_encoder_ctl(state, SPEEX_SET_DTX, &on);
    }
    if (SpeexCFG::dtxEnabled && !(SpeexCFG::vadEnabled || SpeexCFG::vbrEnabled || SpeexCFG::abrEnabled)) {
        Logger::log(Logger::Info, "Warning: dtx is useless without vad, vbr or abr\n");
    } else if ((SpeexCFG::vbrEnabled || SpeexCFG::abrEnabled) && SpeexCFG::vadEnabled) {
        Logger::log(Logger::Info, "Warning: vad is already implied by vbr or abr\n");
    }
    if (SpeexCFG::abrEnabled) {
        // The ABR request takes the average bit rate to aim at; 1 bit/s would
        // starve every frame, so aim at the bit rate set, else at what the
        // settings above give.
        spx_int32_t target = SpeexCFG::bitRate;
        if (target <= 0) {
            speex_encoder_ctl(state, SPEEX_GET_BITRATE, &target);
        }
        speex_encoder_ctl(state, SPEEX_SET_ABR, &target);
    }
    spx_int32_t highPass = SpeexCFG::highPassEnabled ? 1 : 0;
    speex_encoder_ctl(state, SPEEX_SET_HIGHPASS, &highPass);
}

void OggSpeexEncoder::writeHeader() {
    int size = 0;
    char* bytes = speex_header_to_packet(&header, &size);
    ogg_packet packet;
    std::memset(&packet, 0, sizeof(packet));
    packet.packet = reinterpret_cast<unsigned char*>(bytes);
    packet.bytes = size;
    packet.b_o_s = 1;
    packet.packetno = packetCount++;
    ogg_stream_packetin(&stream, &packet);
    speex_header_free(bytes);
    ogg_page page;
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage(page);
    }

    std::vector<unsigned char> comments = commentPacket();
    packet.packet = comments.data();
    packet.bytes = static_cast<long>(comments.size());
    packet.b_o_s = 0;
    packet.packetno = packetCount++;
    ogg_stream_packetin(&stream, &packet);
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage(page);
    }
}

void OggSpeexEncoder::write(const SoundDataBuffer& aBuffer) {
    KD_ASSERT(aBuffer.info.getSampleRate() == info.getSampleRate());
    KD_ASSERT(aBuffer.info.getChannelCount() == info.getChannelCount());
    KD_ASSERT(aBuffer.info.getSampleSize() == info.getSampleSize());
    if (!initialized || closed) {
        return;
    }
    pendingInput.insert(pendingInput.end(), aBuffer.data.begin(), aBuffer.data.end());
    const size_t frameBytes = getFrameBytes();
    size_t consumed = 0;
    while (pendingInput.size() - consumed >= frameBytes) {
        encodeFrame(pendingInput.data() + consumed);
        consumed += frameBytes;
        if (framesPerPacket <= 0 || frameCount % framesPerPacket == 0) {
            emitPacket();
        }
    }
    pendingInput.erase(pendingInput.begin(), pendingInput.begin() + consumed);
}

void OggSpeexEncoder::encodeFrame(const unsigned char* bytes) {
    const int channels = info.getChannelCount();
    std::vector<spx_int16_t> samples(static_cast<size_t>(frameSize) * channels);
    for (size_t i = 0; i < samples.size(); ++i) {
        if (info.getSampleSize() == 2) {
            const unsigned char* sample = bytes + 2 * i;
            samples[i] = static_cast<spx_int16_t>(littleEndian ? sample[0] | sample[1] << 8
                                                               : sample[1] | sample[0] << 8);
        } else {
            samples[i] = static_cast<spx_int16_t>(static_cast<signed char>(bytes[i]) * 256);
        }
    }
    if (channels == 2) {
        speex_encode_stereo_int(samples.data(), frameSize, &bits);
    }
    speex_encode_int(state, samples.data(), &bits);
    ++frameCount;
    totalSamples += frameSize;
}

size_t OggSpeexEncoder::getFrameBytes() const {
    return static_cast<size_t>(frameSize) * info.getChannelCount() * info.getSampleSize();
}

void OggSpeexEncoder::encodePaddedFrame() {
    const long long samples =
        static_cast<long long>(pendingInput.size() / (info.getChannelCount() * info.getSampleSize()));
    // Zero bytes are silence in both sample sizes.
    pendingInput.resize(getFrameBytes(), 0);
    encodeFrame(pendingInput.data());
    pendingInput.clear();
    // The granule counts only what was recorded, so decoders trim the padding.
    totalSamples -= frameSize - samples;
}

void OggSpeexEncoder::emitPacket() {
    submitHeldPacket(false);
    speex_bits_insert_terminator(&bits);
    heldPacket.resize(kMaxPacketBytes);
    heldPacket.resize(speex_bits_write(&bits, reinterpret_cast<char*>(heldPacket.data()), kMaxPacketBytes));
    speex_bits_reset(&bits);
    heldGranule = std::min(frameCount * frameSize - lookahead, totalSamples);
    packetHeld = true;
    ++packetCount;
}

void OggSpeexEncoder::submitHeldPacket(bool endOfStream) {
    if (!packetHeld) {
        return;
    }
    ogg_packet packet;
    std::memset(&packet, 0, sizeof(packet));
    packet.packet = heldPacket.data();
    packet.bytes = static_cast<long>(heldPacket.size());
    packet.e_o_s = endOfStream ? 1 : 0;
    packet.granulepos = heldGranule;
    packet.packetno = packetCount - 1;
    ogg_stream_packetin(&stream, &packet);
    heldPacket.clear();
    packetHeld = false;
    ogg_page page;
    while (ogg_stream_pageout_fill(&stream, &page, static_cast<int>(pageFillBytes)) != 0) {
        appendPage(page);
    }
}

void OggSpeexEncoder::closeWrite() {
    if (!initialized || closed) {
        return;
    }
    closed = true;
    // Ogg streams end with a page flagged end-of-stream, and only a packet can carry the flag: a
    // recording shorter than one frame still gets one.
    if (frameCount == 0) {
        encodePaddedFrame();
        emitPacket();
    } else if (framesPerPacket > 0 && frameCount % framesPerPacket != 0) {
        emitPacket();
    }
    submitHeldPacket(true);
    ogg_page page;
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage(page);
    }
}

void OggSpeexEncoder::appendPage(const ogg_page& page) {
    output.insert(output.end(), page.header, page.header + page.header_len);
    output.insert(output.end(), page.body, page.body + page.body_len);
    bytesWritten += page.header_len + page.body_len;
}

boost::shared_ptr<SoundDataBuffer> OggSpeexEncoder::read(int maxBytes) {
    boost::shared_ptr<SoundDataBuffer> buffer(new SoundDataBuffer);
    buffer->info = SoundDataInfo(SoundDataInfo::OGG_SPEEX, info.getChannelCount(), info.getSampleRate(),
                                 info.getSampleSize(), -1);
    const size_t count =
        maxBytes < 0 ? output.size() : std::min(output.size(), static_cast<size_t>(maxBytes));
    buffer->data.assign(output.begin(), output.begin() + count);
    output.erase(output.begin(), output.begin() + count);
    return buffer;
}

}  // namespace Sound
