#pragma once

#include <string>

// The first broken promise of a scenario run, with the step it broke in.
// Everything that watches the application writes here; the scenario stops at
// the end of the step that broke something. Main thread only.
class InvariantReport {
public:
    void enterStep(int number, const char* name);
    void breach(const std::string& what);

    bool holds() const { return firstBreach.empty(); }
    // "step 12 (submit task): a second final callback", or "" while it holds.
    const std::string& first() const { return firstBreach; }

private:
    int step = 0;
    std::string stepName = "start";
    std::string firstBreach;
};
