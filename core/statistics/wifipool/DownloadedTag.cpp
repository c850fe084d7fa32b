#include "statistics/wifipool/DownloadedTag.h"

namespace Statistics {

void DownloadedTag::appendNodeName(std::string& out) const {
    out += "d";
}

void DownloadedTag::appendNodeTagText(std::string& out) const {
    long long elapsed = static_cast<long long>(chunk->time) - static_cast<long long>(info->startTime);
    out += "size=\"" + std::to_string(chunk->size) + "\" time=\"" + std::to_string(elapsed) + "\"";
}

void DownloadedTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
