#pragma once

#include <cstddef>
#include <string>

#include "devserver/Journal.h"

namespace DevServer {

// Undoes what the Wi-Fi pool collector does to an upload: takes the "data"
// part of the multipart body (split by cpp-httplib), unscrambles it with the
// build's key, gunzips it and reads the XML document through the library's loader. The
// multipart boundary must be the build's (the client may lengthen it, never
// change its start). Untrusted input: any bytes give a record, never a crash.
// Any thread.
class UploadDecoder {
public:
    // Deeper nesting than this is refused before TinyXML sees the document;
    // the collector's documents nest five deep.
    static const std::size_t kMaxDepth = 32;

    explicit UploadDecoder(std::size_t maxDocumentBytes);

    // Fills record (all but bytes and storedFile) from the request's
    // Content-Type and its "data" part (null when there is none). On success
    // record.accepted is true and record.status 200; otherwise record.status
    // is the 4xx status to answer and record.reason says why. gzipped is
    // false only when the request said gzip=0.
    void decode(const std::string& contentType, const std::string* data, bool gzipped,
                UploadRecord& record) const;

    // The boundary parameter of a multipart/form-data Content-Type; false for
    // another media type or a missing boundary.
    static bool boundaryOf(const std::string& contentType, std::string& boundary);
    static void unscramble(std::string& data);

private:
    bool gunzip(const std::string& data, std::string& document, UploadRecord& record) const;
    bool readDocument(UploadRecord& record) const;

    std::size_t maxDocumentBytes;
};

}  // namespace DevServer
