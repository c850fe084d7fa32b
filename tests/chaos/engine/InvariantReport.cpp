#include "InvariantReport.h"

void InvariantReport::enterStep(int number, const char* name) {
    step = number;
    stepName = name;
}

void InvariantReport::breach(const std::string& what) {
    if (firstBreach.empty()) {
        firstBreach = "step " + std::to_string(step) + " (" + stepName + "): " + what;
    }
}
