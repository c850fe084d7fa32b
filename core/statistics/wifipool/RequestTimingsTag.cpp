#include "statistics/wifipool/RequestTimingsTag.h"

namespace Statistics {

void RequestTimingsTag::appendNodeName(std::string& out) const {
    out += "request-timings";
}

void RequestTimingsTag::appendNodeTagText(std::string& out) const {
    (void)out;
}

void RequestTimingsTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
