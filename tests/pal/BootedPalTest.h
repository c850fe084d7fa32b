#pragma once

#include <KD/kdext.h>
#include <gtest/gtest.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <filesystem>
#include <string>
#include <vector>

// Boots the platform layer alone (no library code) for one test: a fresh host
// folder as file root, every simulated value at its default, a virtual clock
// and the log captured in `log`. The test body runs on the main thread.
class BootedPalTest : public ::testing::Test {
protected:
    void SetUp() override {
        std::string pattern = (std::filesystem::temp_directory_path() / "pal-test-XXXXXX").string();
        ASSERT_NE(mkdtemp(pattern.data()), nullptr);
        root = pattern;
        pal::setFileRoot(root);
        pal::resetSimulation();
        pal::useVirtualClock();
        pal::setLogSink([this](const char* line) { log.push_back(line); });
        pal::start();
    }

    void TearDown() override {
        pal::shutdown();
        pal::resetSimulation();
        pal::setLogSink(pal::LogSink());
        std::filesystem::remove_all(root);
    }

    int logLinesWith(const std::string& text) const {
        int count = 0;
        for (const std::string& line : log) {
            count += line.find(text) != std::string::npos ? 1 : 0;
        }
        return count;
    }

    std::string root;
    std::vector<std::string> log;
};
