#include "statistics/wifipool/UploadedTag.h"

namespace Statistics {

void UploadedTag::appendNodeName(std::string& out) const {
    out += "u";
}

void UploadedTag::appendNodeTagText(std::string& out) const {
    out += "size=\"" + std::to_string(info->uploadSize) + "\"";
}

void UploadedTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
