#pragma once

#include <vorbis/vorbisenc.h>

#include <cmath>
#include <vector>

// Ogg Vorbis files made with libvorbisenc, so that the decoder is checked
// against an encoder that is not ours: a 440 Hz tone of samplesPerChannel
// samples on every channel.
inline std::vector<unsigned char> makeVorbisFile(int channels, long rate, long samplesPerChannel) {
    std::vector<unsigned char> out;
    vorbis_info info;
    vorbis_info_init(&info);
    if (vorbis_encode_init_vbr(&info, channels, rate, 0.3f) != 0) {
        vorbis_info_clear(&info);
        return out;
    }
    vorbis_comment comment;
    vorbis_comment_init(&comment);
    vorbis_dsp_state dsp;
    vorbis_block block;
    vorbis_analysis_init(&dsp, &info);
    vorbis_block_init(&dsp, &block);
    ogg_stream_state stream;
    ogg_stream_init(&stream, 4711);

    ogg_page page;
    auto appendPage = [&out, &page]() {
        out.insert(out.end(), page.header, page.header + page.header_len);
        out.insert(out.end(), page.body, page.body + page.body_len);
    };
    ogg_packet header, commentHeader, codeHeader;
    vorbis_analysis_headerout(&dsp, &comment, &header, &commentHeader, &codeHeader);
    ogg_stream_packetin(&stream, &header);
    ogg_stream_packetin(&stream, &commentHeader);
    ogg_stream_packetin(&stream, &codeHeader);
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage();
    }

    const long chunk = 1024;
    for (long done = 0; done <= samplesPerChannel;) {
        const long n = std::min(chunk, samplesPerChannel - done);
        if (n == 0) {
            vorbis_analysis_wrote(&dsp, 0);
        } else {
            float** buffer = vorbis_analysis_buffer(&dsp, n);
            for (long i = 0; i < n; ++i) {
                const float value = 0.5f * std::sin(2.0 * M_PI * 440.0 * (done + i) / rate);
                for (int c = 0; c < channels; ++c) {
                    buffer[c][i] = value;
                }
            }
            vorbis_analysis_wrote(&dsp, n);
        }
        done += n == 0 ? 1 : n;
        while (vorbis_analysis_blockout(&dsp, &block) == 1) {
            vorbis_analysis(&block, nullptr);
            vorbis_bitrate_addblock(&block);
            ogg_packet packet;
            while (vorbis_bitrate_flushpacket(&dsp, &packet)) {
                ogg_stream_packetin(&stream, &packet);
                while (ogg_stream_pageout(&stream, &page) != 0) {
                    appendPage();
                }
            }
        }
    }
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage();
    }
    ogg_stream_clear(&stream);
    vorbis_block_clear(&block);
    vorbis_dsp_clear(&dsp);
    vorbis_comment_clear(&comment);
    vorbis_info_clear(&info);
    return out;
}
