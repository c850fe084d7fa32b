// Sound: one second of speech capture through OpenAL, encoded to Ogg Speex,
// then a spoken prompt decoded from Ogg Vorbis. No microphone is needed: the
// scene points OpenAL Soft at a private ALSA configuration whose capture
// device reads a recording the scene writes first (ALSA's "file" plugin over
// its "null" device). The prompt comes from libvorbisenc, an encoder
// independent of the decoder shown.

#include <KD/kd.h>
#include <stdlib.h>
#include <unistd.h>
#include <vorbis/vorbisenc.h>

#include <algorithm>
#include <boost/make_shared.hpp>
#include <cmath>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>
#include <vector>

#include "DemoScene.h"
#include "sound/OggSpeexEncoder.h"
#include "sound/OggVorbisDecoder.h"
#include "sound/Recorder.h"

namespace {

const int kCaptureRate = 8000;
const int kSpeexQuality = 8;
const int kPromptRate = 22050;
const int kPromptChannels = 2;
const double kPi = 3.14159265358979323846;

// Where the capture device's configuration and recording live; the scene
// makes and removes it.
std::string captureFolder() {
    return (std::filesystem::temp_directory_path() / ("mapcore-demo-sound-" + std::to_string(getpid())))
        .string();
}

// OpenAL Soft and ALSA read their configuration at their first use, and the
// environment must not change while other threads may read it: set it while
// the program is still single-threaded.
bool selectCaptureDevice() {
    const std::string folder = captureFolder();
    setenv("ALSA_CONFIG_PATH", (folder + "/asound.conf").c_str(), 1);
    setenv("ALSOFT_CONF", (folder + "/alsoft.conf").c_str(), 1);
    setenv("ALSOFT_DRIVERS", "alsa", 1);
    return true;
}

const bool captureDeviceSelected = selectCaptureDevice();

// A vowel-like sound at 8 kHz: a falling 180 Hz voice with two formants,
// fading in and out, two seconds long (the capture takes one).
std::vector<std::int16_t> voiceRecording() {
    std::vector<std::int16_t> samples(2 * kCaptureRate);
    for (size_t i = 0; i < samples.size(); ++i) {
        const double t = static_cast<double>(i) / kCaptureRate;
        const double pitch = 180.0 - 20.0 * t;
        const double envelope = std::min(1.0, std::min(t, 2.0 - t) * 8.0);
        const double value = 0.5 * std::sin(2 * kPi * pitch * t) + 0.3 * std::sin(2 * kPi * 700.0 * t) +
                             0.15 * std::sin(2 * kPi * 1200.0 * t);
        samples[i] = static_cast<std::int16_t>(value * envelope * 12000.0);
    }
    return samples;
}

bool writeCaptureDevice() {
    const std::string folder = captureFolder();
    std::error_code error;
    std::filesystem::create_directories(folder, error);
    if (error) {
        return false;
    }
    const std::vector<std::int16_t> samples = voiceRecording();
    std::ofstream source(folder + "/voice.raw", std::ios::binary);
    for (std::int16_t sample : samples) {
        const char bytes[2] = {static_cast<char>(sample & 0xff), static_cast<char>((sample >> 8) & 0xff)};
        source.write(bytes, 2);
    }
    std::ofstream(folder + "/asound.conf") << "pcm.!default {\n  type file\n  slave.pcm { type null }\n"
                                              "  file \"/dev/null\"\n  infile \""
                                           << folder << "/voice.raw\"\n  format \"raw\"\n}\n";
    std::ofstream(folder + "/alsoft.conf") << "[general]\ndrivers = alsa\n[alsa]\ncapture = default\n";
    return source.good();
}

void appendPage(std::vector<unsigned char>& out, const ogg_page& page) {
    out.insert(out.end(), page.header, page.header + page.header_len);
    out.insert(out.end(), page.body, page.body + page.body_len);
}

// A two-note chime, as a navigation prompt might start, encoded with
// libvorbisenc.
std::vector<unsigned char> vorbisPrompt(long samplesPerChannel) {
    std::vector<unsigned char> out;
    vorbis_info info;
    vorbis_info_init(&info);
    if (vorbis_encode_init_vbr(&info, kPromptChannels, kPromptRate, 0.4f) != 0) {
        vorbis_info_clear(&info);
        return out;
    }
    vorbis_comment comment;
    vorbis_comment_init(&comment);
    vorbis_comment_add_tag(&comment, "TITLE", "mapcore demo prompt");
    vorbis_dsp_state dsp;
    vorbis_block block;
    vorbis_analysis_init(&dsp, &info);
    vorbis_block_init(&dsp, &block);
    ogg_stream_state stream;
    ogg_stream_init(&stream, 2027);
    ogg_packet header, commentHeader, codeHeader;
    vorbis_analysis_headerout(&dsp, &comment, &header, &commentHeader, &codeHeader);
    ogg_stream_packetin(&stream, &header);
    ogg_stream_packetin(&stream, &commentHeader);
    ogg_stream_packetin(&stream, &codeHeader);
    ogg_page page;
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage(out, page);
    }
    const long chunk = 1024;
    long done = 0;
    bool ended = false;
    while (!ended) {
        const long n = std::min(chunk, samplesPerChannel - done);
        if (n > 0) {
            float** buffer = vorbis_analysis_buffer(&dsp, n);
            for (long i = 0; i < n; ++i) {
                const double t = static_cast<double>(done + i) / kPromptRate;
                const double note = t < 0.4 ? 784.0 : 659.0;
                const double fade = std::exp(-4.0 * std::fmod(t, 0.4));
                buffer[0][i] = static_cast<float>(0.4 * fade * std::sin(2 * kPi * note * t));
                buffer[1][i] = buffer[0][i] * 0.8f;
            }
        }
        vorbis_analysis_wrote(&dsp, static_cast<int>(n));
        done += n;
        ended = n == 0;
        while (vorbis_analysis_blockout(&dsp, &block) == 1) {
            vorbis_analysis(&block, nullptr);
            vorbis_bitrate_addblock(&block);
            ogg_packet packet;
            while (vorbis_bitrate_flushpacket(&dsp, &packet)) {
                ogg_stream_packetin(&stream, &packet);
                while (ogg_stream_pageout(&stream, &page) != 0) {
                    appendPage(out, page);
                }
            }
        }
    }
    while (ogg_stream_flush(&stream, &page) != 0) {
        appendPage(out, page);
    }
    ogg_stream_clear(&stream);
    vorbis_block_clear(&block);
    vorbis_dsp_clear(&dsp);
    vorbis_comment_clear(&comment);
    vorbis_info_clear(&info);
    return out;
}

// Leaves bytes in the demo's output folder for the final summary.
void saveOutput(const char* name, const std::vector<unsigned char>& bytes, const std::string& what) {
    const std::string path = (std::filesystem::path(demo::outputFolder()) / name).string();
    std::ofstream out(path, std::ios::binary);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
    if (out.good()) {
        demo::noteFile(path, what);
    } else {
        demo::say("could not write %s", path.c_str());
    }
}

class SoundScene;

// Hands the recorder's slices to the scene; held by the scene, registered
// weakly with the recorder.
class SliceCollector : public Sound::RecorderListener {
public:
    explicit SliceCollector(SoundScene* scene) : scene(scene) {}
    void onSoundData(Sound::Recorder* recorder,
                     const boost::shared_ptr<Sound::SoundDataBuffer>& buffer) override;

private:
    SoundScene* scene;
};

// Main thread only.
class SoundScene : public DemoScene {
public:
    SoundScene() : collector(boost::make_shared<SliceCollector>(this)) {}

    ~SoundScene() override {
        if (recorder && recorder->isRecording()) {
            recorder->stopRecording();
        }
        recorder.reset();
        std::error_code ignored;
        std::filesystem::remove_all(captureFolder(), ignored);
    }

    void run(Done done) override {
        finished = done;
        if (!captureDeviceSelected || !writeCaptureDevice()) {
            demo::say("cannot write the capture device's files under %s", captureFolder().c_str());
            decodePrompt();
            return;
        }
        demo::say("capture device: ALSA file plugin reading %s/voice.raw (OpenAL Soft on ALSA)",
                  captureFolder().c_str());
        recorder = Sound::Recorder::createRecorder();
        recorder->setSampleRate(kCaptureRate);
        if (!recorder->init()) {
            demo::say("Recorder::init() failed: no capture device");
            decodePrompt();
            return;
        }
        recorder->addListener(collector);
        demo::say("recording one second at %d Hz, mono, in slices of %d ms", recorder->getSampleRate(),
                  recorder->getIntervalMs());
        recorder->startRecording();
    }

    void onSlice(const Sound::SoundDataBuffer& slice) {
        demo::say("slice: %d samples (%zu bytes)", slice.info.getSampleCount(), slice.data.size());
        const size_t wanted = kCaptureRate * 2;
        pcm.insert(pcm.end(), slice.data.begin(),
                   slice.data.begin() + std::min(slice.data.size(), wanted - std::min(wanted, pcm.size())));
        if (pcm.size() < wanted) {
            return;
        }
        demo::say("stopping: the emulated device hands OpenAL all it claims to hold, which takes a moment");
        recorder->stopRecording();
        encodeSpeech();
        decodePrompt();
    }

private:
    void encodeSpeech() {
        Sound::SoundDataBuffer speech;
        speech.info = Sound::SoundDataInfo(Sound::SoundDataInfo::NONE, 1, kCaptureRate, 2,
                                           static_cast<int>(pcm.size() / 2));
        speech.data = pcm;
        Sound::OggSpeexEncoder encoder(speech.info, kSpeexQuality);
        boost::shared_ptr<Sound::SoundDataBuffer> spx = Sound::encode(&encoder, speech);
        const double seconds = static_cast<double>(speech.info.getSampleCount()) / kCaptureRate;
        demo::say("captured %.2f s: %zu bytes of PCM", seconds, speech.data.size());
        demo::say(
            "Ogg Speex (narrowband, quality %d, %d-sample frames): %zu bytes, %.1f kbit/s, %.1f times "
            "smaller",
            kSpeexQuality, encoder.getFrameSize(), spx->data.size(), spx->data.size() * 8 / seconds / 1000,
            static_cast<double>(speech.data.size()) / spx->data.size());
        saveOutput("speech.spx", spx->data, "one second of captured speech in Ogg Speex; speexdec plays it");
    }

    void decodePrompt() {
        const long samples = kPromptRate * 8 / 10;
        Sound::SoundDataBuffer prompt;
        prompt.data = vorbisPrompt(samples);
        Sound::SoundDataBuffer pcmOut;
        pcmOut.info = Sound::SoundDataInfo(Sound::SoundDataInfo::NONE, kPromptChannels, kPromptRate, 2, -1);
        Sound::OggVorbisDecoder decoder(pcmOut, prompt);
        const bool decoded = decoder.decode();
        demo::say("Vorbis prompt (libvorbisenc, %d Hz stereo, %.2f s): %zu bytes", kPromptRate,
                  static_cast<double>(samples) / kPromptRate, prompt.data.size());
        demo::say("OggVorbisDecoder::decode() -> %s: %zu bytes of PCM, %.2f s", decoded ? "true" : "false",
                  pcmOut.data.size(),
                  static_cast<double>(pcmOut.data.size()) / (kPromptChannels * 2 * kPromptRate));
        saveOutput("prompt.ogg", prompt.data, "the Vorbis prompt the sound scene decoded");

        Sound::SoundDataBuffer truncated;
        truncated.data.assign(prompt.data.begin(), prompt.data.begin() + prompt.data.size() * 2 / 3);
        Sound::SoundDataBuffer nothing;
        Sound::OggVorbisDecoder refuser(nothing, truncated);
        const bool refused = !refuser.decode();
        demo::say("the same prompt cut to %zu bytes: decode() -> %s, %zu bytes of output",
                  truncated.data.size(), refused ? "false" : "true", nothing.data.size());
        finished();
    }

    boost::shared_ptr<SliceCollector> collector;
    boost::shared_ptr<Sound::Recorder> recorder;
    std::vector<unsigned char> pcm;
    Done finished;
};

void SliceCollector::onSoundData(Sound::Recorder*, const boost::shared_ptr<Sound::SoundDataBuffer>& buffer) {
    scene->onSlice(*buffer);
}

DemoSceneRegistration<SoundScene> registration("Sound", 80);

}  // namespace
