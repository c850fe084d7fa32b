#include "DemoSummary.h"

#include <algorithm>
#include <filesystem>
#include <string>
#include <utility>
#include <vector>

#include "DemoScene.h"

namespace demo {

namespace {

// "3 normal, 1 disconnected" in the order each value first appears.
std::string tally(const std::vector<std::string>& values) {
    std::vector<std::pair<std::string, int> > counts;
    for (const std::string& value : values) {
        bool found = false;
        for (std::pair<std::string, int>& count : counts) {
            if (count.first == value) {
                ++count.second;
                found = true;
                break;
            }
        }
        if (!found) {
            counts.emplace_back(value, 1);
        }
    }
    std::string text;
    for (const std::pair<std::string, int>& count : counts) {
        text += (text.empty() ? "" : ", ") + std::to_string(count.second) + " " + count.first;
    }
    return text.empty() ? "none" : text;
}

void summariseStartups(const std::vector<DevServer::StartupRecord>& startups) {
    std::vector<std::string> kinds;
    for (const DevServer::StartupRecord& record : startups) {
        kinds.push_back(record.sentUuid.empty() ? "without uuid" : "with uuid " + record.sentUuid);
    }
    say("  startup requests:    %zu (%s)", startups.size(), tally(kinds).c_str());
}

void summarisePositionings(const std::vector<DevServer::PositioningRecord>& positionings) {
    std::vector<std::string> outcomes;
    size_t radios = 0;
    for (const DevServer::PositioningRecord& record : positionings) {
        outcomes.push_back(record.found ? "located" : "error " + std::to_string(record.errorCode));
        radios += record.radios.size();
    }
    say("  positioning queries: %zu (%s), %zu radios named", positionings.size(), tally(outcomes).c_str(),
        radios);
}

void summariseUploads(const std::vector<DevServer::UploadRecord>& uploads) {
    std::vector<std::string> outcomes;
    std::vector<std::string> chunkTypes;
    for (const DevServer::UploadRecord& record : uploads) {
        outcomes.push_back(record.accepted ? "decoded" : "refused: " + record.reason);
        chunkTypes.insert(chunkTypes.end(), record.chunkTypes.begin(), record.chunkTypes.end());
    }
    say("  Wi-Fi pool uploads:  %zu (%s) holding %zu chunks (%s)", uploads.size(), tally(outcomes).c_str(),
        chunkTypes.size(), tally(chunkTypes).c_str());
}

// The files the server wrote in its data folder since the run started, by
// name; a folder given again keeps the files of earlier runs.
std::vector<std::string> serverFiles(const std::string& dataFolder, std::filesystem::file_time_type since) {
    std::vector<std::string> names;
    std::error_code error;
    for (const std::filesystem::directory_entry& entry :
         std::filesystem::directory_iterator(dataFolder, error)) {
        if (entry.is_regular_file(error) && entry.last_write_time(error) >= since) {
            names.push_back(entry.path().filename().string());
        }
    }
    std::sort(names.begin(), names.end());
    return names;
}

std::string describeServerFile(const std::string& name, const std::vector<DevServer::UploadRecord>& uploads) {
    for (const DevServer::UploadRecord& upload : uploads) {
        if (upload.storedFile == name) {
            return "an upload of " + std::to_string(upload.chunks) + " chunks, decoded by the server";
        }
    }
    return "written by the server";
}

}  // namespace

void printSummary(const std::string& baseUrl, const DevServer::Journal& journal,
                  const std::string& dataFolder, std::filesystem::file_time_type since) {
    say("=== summary ===");
    say("the development server at %s answered:", baseUrl.c_str());
    summariseStartups(journal.startups);
    summarisePositionings(journal.positionings);
    summariseUploads(journal.uploads);
    say("the application:");
    for (const std::pair<std::string, int>& count : counts()) {
        say("  %s: %d", count.first.c_str(), count.second);
    }
    say("files written:");
    for (const std::pair<std::string, std::string>& file : notedFiles()) {
        say("  %s (%s)", file.first.c_str(), file.second.c_str());
    }
    for (const std::string& name : serverFiles(dataFolder, since)) {
        say("  %s/%s (%s)", dataFolder.c_str(), name.c_str(),
            describeServerFile(name, journal.uploads).c_str());
    }
}

}  // namespace demo
