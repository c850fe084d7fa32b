#pragma once

#include <clocale>
#include <string>

// Sets the C library's locale for one test and restores the previous one after it. Numbers
// written or read by the library must not change under a decimal-comma locale such as
// "de_DE.UTF-8", which the install script generates; without it active() is false and the test
// should skip rather than pass vacuously.
class ScopedLocale {
public:
    explicit ScopedLocale(const char* name) : previous(std::setlocale(LC_ALL, nullptr)) {
        ok = std::setlocale(LC_ALL, name) != nullptr;
    }
    ~ScopedLocale() { std::setlocale(LC_ALL, previous.c_str()); }
    ScopedLocale(const ScopedLocale&) = delete;
    ScopedLocale& operator=(const ScopedLocale&) = delete;

    bool active() const { return ok; }

private:
    std::string previous;
    bool ok;
};
