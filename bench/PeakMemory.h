#pragma once

#include <fstream>
#include <string>

// Peak resident memory of this process (Linux), for benchmarks whose figure
// is what a run costs in memory rather than in time.
class PeakMemoryProbe {
public:
    // Makes the peak start from the current resident size again.
    PeakMemoryProbe() {
        std::ofstream("/proc/self/clear_refs") << "5";
        start = statusKb("VmRSS:");
    }
    // How far the resident size rose above where it stood at construction.
    double growthMb() const { return static_cast<double>(statusKb("VmHWM:") - start) / 1024.0; }

private:
    static long statusKb(const std::string& field) {
        std::ifstream status("/proc/self/status");
        std::string line;
        while (std::getline(status, line)) {
            if (line.compare(0, field.size(), field) == 0) {
                return std::stol(line.substr(field.size()));
            }
        }
        return 0;
    }

    long start;
};
