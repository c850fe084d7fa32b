#pragma once

#include <clocale>
#include <locale>
#include <stdexcept>
#include <string>

// Sets the process's locale, for the C library and as C++'s global locale, for one test and
// restores both after it. Numbers written or read by the library must not change under a
// decimal-comma locale such as "de_DE.UTF-8", which the install script generates; without it
// active() is false and the test should skip rather than pass vacuously.
class ScopedLocale {
public:
    explicit ScopedLocale(const char* name) : previousC(std::setlocale(LC_ALL, nullptr)) {
        try {
            // A named global locale is also set for the C library.
            std::locale::global(std::locale(name));
            ok = true;
        } catch (const std::runtime_error&) {
            ok = false;
        }
    }
    ~ScopedLocale() {
        std::locale::global(previous);
        std::setlocale(LC_ALL, previousC.c_str());
    }
    ScopedLocale(const ScopedLocale&) = delete;
    ScopedLocale& operator=(const ScopedLocale&) = delete;

    bool active() const { return ok; }

private:
    std::locale previous;
    std::string previousC;
    bool ok;
};
