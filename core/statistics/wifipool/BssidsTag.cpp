#include "statistics/wifipool/BssidsTag.h"

namespace Statistics {

void BssidsTag::appendNodeName(std::string& out) const {
    out += "bssids";
}

void BssidsTag::appendNodeTagText(std::string& out) const {
    (void)out;
}

void BssidsTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
