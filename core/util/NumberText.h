#pragma once

#include <string>

namespace Util {

// Numbers as text for files, documents and requests: always with a decimal point, whatever
// locale the application has set for the C library (a decimal comma would turn "48.125" into
// "48,125" and split a URL's or GPX file's values). Any thread.
class NumberText {
public:
    // As printf's "%.*f".
    static std::string fixed(double value, int decimals);
    // As printf's "%.*g".
    static std::string significant(double value, int digits);
    // The number at the start of text after spaces, as strtod in the "C" locale reads it; 0 when
    // there is none.
    static double leadingDouble(const std::string& text);
};

}  // namespace Util
