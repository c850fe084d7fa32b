#pragma once

#include <string>

namespace DevServer {

// Locale-independent number text and escaping for the server's answers and
// its config file: a decimal-comma locale of the process must not change
// what is read or written. Any thread.
class Text {
public:
    // The whole of text (blanks around it allowed) as a finite number.
    static bool parseDouble(const std::string& text, double& value);
    // The whole of text as a decimal integer within [min, max].
    static bool parseInteger(const std::string& text, long long min, long long max, long long& value);
    // value with the given number of decimals, a '.' as the decimal point.
    static std::string formatFixed(double value, int decimals);
    static std::string trim(const std::string& text);
    // Text for an HTML element or a quoted attribute.
    static std::string escapeHtml(const std::string& text);
    // Text safe for one log line: control characters shown as "\xNN".
    static std::string printable(const std::string& text);
};

}  // namespace DevServer
