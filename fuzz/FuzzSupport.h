#pragma once

#include <KD/kdext.h>
#include <pal/Simulation.h>
#include <stdlib.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <system_error>

// Boots the platform layer once per fuzzing process: a fresh host folder as file root (removed at
// exit), a virtual clock and the calling thread as main thread. Assertions are ignored so that
// library code goes on as it does in a release build, where an assertion only logs; the fuzzer
// looks for crashes, hangs, leaks and undefined behaviour. The log is silent unless
// MAPCORE_FUZZ_LOG=1, which echoes it to stderr for reproducing a finding.
namespace fuzz {

namespace detail {

inline std::string& rootFolder() {
    static std::string root;
    return root;
}

inline void removeRootFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(rootFolder(), ignored);
}

inline bool boot() {
    std::string pattern = (std::filesystem::temp_directory_path() / "mapcore-fuzz-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        std::perror("mapcore fuzz: cannot create a temporary folder");
        std::abort();
    }
    rootFolder() = pattern;
    std::atexit(removeRootFolder);
    const char* echo = std::getenv("MAPCORE_FUZZ_LOG");
    const bool echoLog = echo != nullptr && std::string(echo) == "1";
    pal::setFileRoot(rootFolder());
    pal::resetSimulation();
    pal::useVirtualClock();
    pal::setAssertionHandler([echoLog](const char* expression, const char* file, int line) {
        if (echoLog) {
            std::fprintf(stderr, "[assertion] %s:%d: %s\n", file, line, expression);
        }
    });
    pal::setLogSink([echoLog](const char* line) {
        if (echoLog) {
            std::fprintf(stderr, "[log] %s\n", line);
        }
    });
    pal::start();
    return true;
}

}  // namespace detail

inline void bootPlatform() {
    static const bool booted = detail::boot();
    (void)booted;
}

// Stops the run as a finding when a promise of the code under test does not hold.
inline void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "mapcore fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

// Replaces the platform file at path with the given bytes; false when it cannot be written.
inline bool writePlatformFile(const std::string& path, const void* data, size_t size) {
    kdMkdirAllZVR(path.substr(0, path.rfind('/') + 1).c_str());
    KDFile* file = kdFopen(path.c_str(), "wb");
    if (file == nullptr) {
        return false;
    }
    const bool written = kdFwrite(data, 1, size, file) == size;
    return kdFclose(file) == 0 && written;
}

}  // namespace fuzz
