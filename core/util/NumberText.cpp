#include "util/NumberText.h"

#include <iomanip>
#include <locale>
#include <sstream>

namespace Util {

namespace {

std::string print(double value, int precision, bool fixedPoint) {
    std::ostringstream out;
    out.imbue(std::locale::classic());
    if (fixedPoint) {
        out << std::fixed;
    }
    out << std::setprecision(precision) << value;
    return out.str();
}

}  // namespace

std::string NumberText::fixed(double value, int decimals) {
    return print(value, decimals, true);
}

std::string NumberText::significant(double value, int digits) {
    return print(value, digits, false);
}

double NumberText::leadingDouble(const std::string& text) {
    std::istringstream in(text);
    in.imbue(std::locale::classic());
    double value = 0.0;
    in >> value;
    return in.fail() ? 0.0 : value;
}

}  // namespace Util
