#include "statistics/wifipool/ChunkTag.h"

#include <KD/kd.h>

#include "util/DateTime.h"

namespace Statistics {

ChunkTag::ChunkTag() : time(kdTime(nullptr)) {}

void ChunkTag::appendNodeName(std::string& out) const {
    out += "chunk";
}

void ChunkTag::appendNodeTagText(std::string& out) const {
    out += "type=\"" + escape(type) + "\" time=\"" +
           Util::formatDateTime(time, Util::DATE_TIME_COMPACT, false) + "\" connection=\"" +
           escape(connection) + "\"";
}

void ChunkTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
