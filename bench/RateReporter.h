#pragma once

#include <benchmark/benchmark.h>

#include <map>
#include <string>
#include <vector>

// Prints as usual and keeps each benchmark's items_per_second, so that a
// suite can print the ratio of our path to the raw one at the end. With
// repetitions, the median replaces the single runs.
class RateReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& run : runs) {
            auto rate = run.counters.find("items_per_second");
            bool median = run.run_type == Run::RT_Aggregate && run.aggregate_name == "median";
            if (rate != run.counters.end() && (run.run_type == Run::RT_Iteration || median)) {
                rates[run.run_name.function_name] = rate->second.value;
            }
        }
        ConsoleReporter::ReportRuns(runs);
    }

    double rate(const std::string& benchmark) const {
        auto found = rates.find(benchmark);
        return found != rates.end() ? found->second : 0.0;
    }

private:
    std::map<std::string, double> rates;
};
