#include "devserver/StatusPage.h"

#include "devserver/Text.h"

namespace DevServer {

namespace {

std::string cell(const std::string& text) {
    return "<td>" + Text::escapeHtml(text) + "</td>";
}

std::string row(const std::string& cells) {
    return "<tr>" + cells + "</tr>\n";
}

std::string header(const char* title, std::size_t total, const char* columns) {
    return "<h2>" + std::string(title) + " (" + std::to_string(total) + ")</h2>\n<table>\n<tr>" + columns +
           "</tr>\n";
}

std::string startupRow(const StartupRecord& record) {
    std::string params;
    for (const auto& param : record.params) {
        params += (params.empty() ? "" : " ") + param.first + "=" + param.second;
    }
    return row(cell(record.sentUuid.empty() ? "(none)" : record.sentUuid) + cell(record.answeredUuid) +
               cell(params));
}

std::string positioningRow(const PositioningRecord& record) {
    std::string radios;
    for (const SeenRadio& radio : record.radios) {
        radios += (radios.empty() ? "" : ", ") + radio.kind + " " + radio.id + " " +
                  std::to_string(radio.signal) + (radio.known ? " (known)" : " (unknown)");
    }
    const std::string answer =
        record.found ? Text::formatFixed(record.latitude, 6) + ", " + Text::formatFixed(record.longitude, 6) +
                           " +-" + Text::formatFixed(record.accuracy, 0) + " m"
                     : "error " + std::to_string(record.errorCode) + ": " + record.error;
    return row(cell(record.uuid) + cell(radios) + cell(answer));
}

std::string uploadRow(const UploadRecord& record) {
    std::string types;
    for (const std::string& type : record.chunkTypes) {
        types += (types.empty() ? "" : ", ") + type;
    }
    const std::string outcome =
        record.accepted ? "stored " + (record.storedFile.empty() ? "(in memory)" : record.storedFile)
                        : "refused " + std::to_string(record.status) + ": " + record.reason;
    return row(cell(outcome) + cell(std::to_string(record.bytes)) + cell(record.uuid) + cell(record.model) +
               cell(std::to_string(record.chunks) + (types.empty() ? "" : " (" + types + ")")) +
               cell(std::to_string(record.accessPoints)));
}

// The last kRecent records, newest first.
template <typename Record>
std::string rows(const std::vector<Record>& records, std::string (*render)(const Record&)) {
    std::string out;
    std::size_t shown = 0;
    for (auto it = records.rbegin(); it != records.rend() && shown < StatusPage::kRecent; ++it, ++shown) {
        out += render(*it);
    }
    return out + "</table>\n";
}

}  // namespace

std::string StatusPage::render(const Journal& journal, const std::string& baseUrl) {
    std::string page =
        "<!DOCTYPE html>\n<html><head><meta charset=\"utf-8\"><title>mapcore devserver</title>\n"
        "<style>body{font-family:sans-serif}table{border-collapse:collapse}"
        "td,th{border:1px solid #999;padding:2px 6px;text-align:left;vertical-align:top}</style>"
        "</head><body>\n<h1>mapcore devserver at " +
        Text::escapeHtml(baseUrl) + "</h1>\n<p>The most recent " + std::to_string(kRecent) +
        " of each kind, newest first.</p>\n";
    page += header("Startup requests", journal.startups.size(),
                   "<th>uuid sent</th><th>uuid answered</th><th>parameters</th>");
    page += rows(journal.startups, &startupRow);
    page += header("Positioning queries", journal.positionings.size(),
                   "<th>uuid</th><th>radios</th><th>answer</th>");
    page += rows(journal.positionings, &positioningRow);
    page += header(
        "Uploads", journal.uploads.size(),
        "<th>outcome</th><th>bytes</th><th>uuid</th><th>model</th><th>chunks</th><th>access points</th>");
    page += rows(journal.uploads, &uploadRow);
    return page + "</body></html>\n";
}

}  // namespace DevServer
