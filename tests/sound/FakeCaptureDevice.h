#pragma once

#include <gtest/gtest.h>
#include <stdlib.h>

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>
#include <vector>

// Real OpenAL capture without a sound card: OpenAL Soft on ALSA, with a
// private ALSA configuration whose default capture device the test chooses.
// The environment selects it for this process only, before the first OpenAL
// call, so that neither the user's sound setup nor another process matters.
//
// ALSA's "null" device claims millions of captured samples at any time, so
// what a read gets is bounded only by the reader's buffer. Stopping a capture
// reads all of them once, which costs about a second through the "file"
// plugin and nothing without it: tests that need known samples ask for them.
//
// ALSA notices a changed configuration at the next device opening by the
// file's identity (device, inode, seconds of the last change), so each change
// is a new file renamed into place. Every version keeps a name of its own
// until the end, or a later version could get the inode of an earlier one
// that ALSA still holds as current.
class FakeCaptureDevice : public ::testing::Environment {
public:
    void SetUp() override {
        std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-capture-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr) << "cannot create a temporary folder";
        folder() = pattern;
        const std::string alsoftConf = folder() + "/alsoft.conf";
        std::ofstream(alsoftConf) << "[general]\ndrivers = alsa\n[alsa]\ncapture = default\n";
        captureSilence();
        setenv("ALSA_CONFIG_PATH", alsaConf().c_str(), 1);
        setenv("ALSOFT_CONF", alsoftConf.c_str(), 1);
        setenv("ALSOFT_DRIVERS", "alsa", 1);
    }

    void TearDown() override {
        std::error_code ignored;
        std::filesystem::remove_all(folder(), ignored);
    }

    // From the next opening on, the device gives silence of no defined length.
    static void captureSilence() { configure("pcm.!default { type null }\n"); }

    // From the next opening on, the device gives these samples from the
    // start; reading past their end gives undefined samples.
    static void capture(const std::vector<std::int16_t>& samples) {
        const std::string source = folder() + "/source.raw";
        std::ofstream out(source, std::ios::binary | std::ios::trunc);
        for (std::int16_t sample : samples) {
            const char bytes[2] = {static_cast<char>(sample & 0xff), static_cast<char>((sample >> 8) & 0xff)};
            out.write(bytes, 2);
        }
        out.close();
        configure(fileDevice(source));
    }

    // From the next opening on, the device cannot be opened.
    static void unplug() { configure(fileDevice(folder() + "/missing.raw")); }

private:
    static std::string& folder() {
        static std::string path;
        return path;
    }

    static std::string alsaConf() { return folder() + "/asound.conf"; }

    static std::string fileDevice(const std::string& source) {
        return "pcm.!default {\n"
               "  type file\n"
               "  slave.pcm { type null }\n"
               "  file \"/dev/null\"\n"
               "  infile \"" +
               source +
               "\"\n"
               "  format \"raw\"\n"
               "}\n";
    }

    static void configure(const std::string& text) {
        static int versions = 0;
        const std::string version = alsaConf() + "." + std::to_string(++versions);
        const std::string next = alsaConf() + ".next";
        std::ofstream(version) << text;
        std::error_code error;
        std::filesystem::create_hard_link(version, next, error);
        if (!error) {
            std::filesystem::rename(next, alsaConf(), error);
        }
        ASSERT_FALSE(error) << "cannot replace " << alsaConf() << ": " << error.message();
    }
};
