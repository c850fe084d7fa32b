#pragma once

#include <string>

#include "devserver/Journal.h"

namespace DevServer {

// Keeps accepted uploads in a folder: upload-000001.xml, upload-000002.xml
// ... holding each decoded document, and index.tsv with one line per upload
// (file, UTC time, body bytes, chunks, chunk types, uuid, model). Numbering
// goes on after the files of earlier runs. The folder is made when missing.
// Not thread-safe: the server calls it under its lock.
class UploadStore {
public:
    static const char* const kIndexName;

    explicit UploadStore(std::string folder);

    // Writes record.document and its index line; sets record.storedFile.
    // False, with error set, when the folder cannot be written.
    bool store(UploadRecord& record, std::string& error);

private:
    bool prepare(std::string& error);

    std::string folder;
    bool prepared;
    unsigned long next;
};

}  // namespace DevServer
