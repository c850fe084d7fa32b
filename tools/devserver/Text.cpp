#include "devserver/Text.h"

#include <cmath>
#include <cstdio>
#include <locale>
#include <sstream>

namespace DevServer {

namespace {

bool isBlank(char c) {
    return c == ' ' || c == '\t' || c == '\r' || c == '\n';
}

}  // namespace

bool Text::parseDouble(const std::string& text, double& value) {
    const std::string trimmed = trim(text);
    if (trimmed.empty()) {
        return false;
    }
    std::istringstream in(trimmed);
    in.imbue(std::locale::classic());
    double parsed = 0;
    in >> parsed;
    if (in.fail() || !in.eof() || !std::isfinite(parsed)) {
        return false;
    }
    value = parsed;
    return true;
}

bool Text::parseInteger(const std::string& text, long long min, long long max, long long& value) {
    const std::string trimmed = trim(text);
    std::size_t i = trimmed.size() > 0 && (trimmed[0] == '-' || trimmed[0] == '+') ? 1 : 0;
    if (i == trimmed.size() || trimmed.size() - i > 18) {
        return false;
    }
    long long parsed = 0;
    for (std::size_t digit = i; digit < trimmed.size(); ++digit) {
        if (trimmed[digit] < '0' || trimmed[digit] > '9') {
            return false;
        }
        parsed = parsed * 10 + (trimmed[digit] - '0');
    }
    if (trimmed[0] == '-') {
        parsed = -parsed;
    }
    if (parsed < min || parsed > max) {
        return false;
    }
    value = parsed;
    return true;
}

std::string Text::formatFixed(double value, int decimals) {
    std::ostringstream out;
    out.imbue(std::locale::classic());
    out.setf(std::ios::fixed);
    out.precision(decimals);
    out << value;
    return out.str();
}

std::string Text::trim(const std::string& text) {
    std::size_t begin = 0;
    std::size_t end = text.size();
    while (begin < end && isBlank(text[begin])) {
        ++begin;
    }
    while (end > begin && isBlank(text[end - 1])) {
        --end;
    }
    return text.substr(begin, end - begin);
}

std::string Text::escapeHtml(const std::string& text) {
    std::string escaped;
    escaped.reserve(text.size());
    for (char c : text) {
        switch (c) {
            case '&':
                escaped += "&amp;";
                break;
            case '<':
                escaped += "&lt;";
                break;
            case '>':
                escaped += "&gt;";
                break;
            case '"':
                escaped += "&quot;";
                break;
            case '\'':
                escaped += "&#39;";
                break;
            default:
                escaped += c;
        }
    }
    return escaped;
}

std::string Text::printable(const std::string& text) {
    std::string shown;
    for (unsigned char c : text) {
        if (c < 0x20 || c == 0x7f) {
            char code[8];
            std::snprintf(code, sizeof(code), "\\x%02x", c);
            shown += code;
        } else {
            shown += static_cast<char>(c);
        }
    }
    return shown;
}

}  // namespace DevServer
