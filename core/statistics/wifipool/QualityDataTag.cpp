#include "statistics/wifipool/QualityDataTag.h"

namespace Statistics {

void QualityDataTag::appendNodeName(std::string& out) const {
    out += "quality-data";
}

void QualityDataTag::appendNodeTagText(std::string& out) const {
    (void)out;
}

void QualityDataTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
