#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace DevServer {

// One startup request and what the server answered.
struct StartupRecord {
    // The uuid the client sent; empty for a client that has none yet.
    std::string sentUuid;
    // The uuid in the answer: the sent one, or a new one for a new client.
    std::string answeredUuid;
    // Every query parameter as the client sent it (decoded), uuid and lang included.
    std::map<std::string, std::string> params;
};

// One radio named in a positioning query.
struct SeenRadio {
    // "wifi" with the BSSID as twelve lower-case hexadecimal digits, or "cell"
    // with "mcc/mnc/lac/cid".
    std::string kind;
    std::string id;
    int signal = 0;
    bool known = false;
};

// One positioning query and its answer.
struct PositioningRecord {
    std::string uuid;
    std::vector<SeenRadio> radios;
    // A position was answered; otherwise errorCode and error say why not.
    bool found = false;
    double latitude = 0;
    double longitude = 0;
    double accuracy = 0;
    // The code of the answer's error element, or the HTTP status of a refusal.
    int errorCode = 0;
    std::string error;
};

// One Wi-Fi pool upload, accepted or refused.
struct UploadRecord {
    bool accepted = false;
    // The HTTP status answered.
    int status = 0;
    // Why it was refused; empty when accepted.
    std::string reason;
    // The size of the request body.
    std::size_t bytes = 0;
    std::string uuid;
    std::string model;
    int chunks = 0;
    // The type attribute of each chunk, in document order.
    std::vector<std::string> chunkTypes;
    int accessPoints = 0;
    // The file the decoded document was stored in, below the data folder;
    // empty when nothing was stored.
    std::string storedFile;
    // The decoded XML document as uploaded.
    std::string document;
};

// What the server has seen, oldest first. Each list keeps the most recent
// entries only (Config::journalLimit).
struct Journal {
    std::vector<StartupRecord> startups;
    std::vector<PositioningRecord> positionings;
    std::vector<UploadRecord> uploads;
};

}  // namespace DevServer
