#include "devserver/UploadStore.h"

#include <cstdio>
#include <ctime>
#include <filesystem>
#include <fstream>

namespace DevServer {

namespace {

const char kPrefix[] = "upload-";
const char kSuffix[] = ".xml";

std::string fileName(unsigned long number) {
    char name[32];
    std::snprintf(name, sizeof(name), "%s%06lu%s", kPrefix, number, kSuffix);
    return name;
}

// The number of an "upload-NNNNNN.xml" name, or 0.
unsigned long numberOf(const std::string& name) {
    const std::size_t prefix = sizeof(kPrefix) - 1;
    const std::size_t suffix = sizeof(kSuffix) - 1;
    if (name.size() <= prefix + suffix || name.compare(0, prefix, kPrefix) != 0 ||
        name.compare(name.size() - suffix, suffix, kSuffix) != 0) {
        return 0;
    }
    unsigned long number = 0;
    for (std::size_t i = prefix; i < name.size() - suffix; ++i) {
        if (name[i] < '0' || name[i] > '9' || number > 100000000ul) {
            return 0;
        }
        number = number * 10 + static_cast<unsigned long>(name[i] - '0');
    }
    return number;
}

// Index fields hold no tabs or line breaks.
std::string field(const std::string& text) {
    std::string cleaned;
    for (char c : text) {
        cleaned += c == '\t' || c == '\n' || c == '\r' ? ' ' : c;
    }
    return cleaned.empty() ? "-" : cleaned;
}

std::string utcNow() {
    const std::time_t now = std::time(nullptr);
    std::tm parts;
    gmtime_r(&now, &parts);
    char text[32];
    std::strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%SZ", &parts);
    return text;
}

}  // namespace

const char* const UploadStore::kIndexName = "index.tsv";

UploadStore::UploadStore(std::string folder) : folder(std::move(folder)), prepared(false), next(1) {}

bool UploadStore::prepare(std::string& error) {
    std::error_code failure;
    std::filesystem::create_directories(folder, failure);
    if (failure) {
        error = "cannot make " + folder + ": " + failure.message();
        return false;
    }
    for (std::filesystem::directory_iterator it(folder, failure), end; !failure && it != end;
         it.increment(failure)) {
        const unsigned long number = numberOf(it->path().filename().string());
        if (number >= next) {
            next = number + 1;
        }
    }
    if (failure) {
        error = "cannot list " + folder + ": " + failure.message();
        return false;
    }
    prepared = true;
    return true;
}

bool UploadStore::store(UploadRecord& record, std::string& error) {
    if (!prepared && !prepare(error)) {
        return false;
    }
    const std::string name = fileName(next);
    const std::filesystem::path path = std::filesystem::path(folder) / name;
    {
        std::ofstream out(path, std::ios::binary | std::ios::trunc);
        out << record.document;
        if (!out.flush()) {
            error = "cannot write " + path.string();
            return false;
        }
    }
    std::string types;
    for (const std::string& type : record.chunkTypes) {
        types += (types.empty() ? "" : ",") + type;
    }
    std::ofstream index(std::filesystem::path(folder) / kIndexName, std::ios::binary | std::ios::app);
    index << name << '\t' << utcNow() << '\t' << record.bytes << '\t' << record.chunks << '\t' << field(types)
          << '\t' << field(record.uuid) << '\t' << field(record.model) << '\n';
    if (!index.flush()) {
        error = "cannot append to " + (std::filesystem::path(folder) / kIndexName).string();
        return false;
    }
    ++next;
    record.storedFile = name;
    return true;
}

}  // namespace DevServer
