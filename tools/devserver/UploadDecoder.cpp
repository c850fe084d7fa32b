#include "devserver/UploadDecoder.h"

#include <tinyxml.h>
#include <zlib.h>

#include <cctype>
#include <vector>

#include "devserver/Text.h"
#include "statistics/wifipool/UploadConstants.h"
#include "util/XmlLoader.h"

namespace DevServer {

namespace {

const int kBadRequest = 400;
const int kPayloadTooLarge = 413;
const int kUnsupportedMediaType = 415;
// zlib's window bits for a gzip wrapper only.
const int kGzipWindowBits = 16 + MAX_WBITS;

bool refuse(UploadRecord& record, int status, const std::string& reason) {
    record.accepted = false;
    record.status = status;
    record.reason = reason;
    return false;
}

std::string attribute(const TiXmlElement* element, const char* name) {
    const char* value = element->Attribute(name);
    return value != nullptr ? value : "";
}

// Frees zlib's state however the inflation ends.
class Inflater {
public:
    Inflater() : ready(false) { stream = z_stream(); }
    ~Inflater() {
        if (ready) {
            inflateEnd(&stream);
        }
    }
    bool init() { return ready = inflateInit2(&stream, kGzipWindowBits) == Z_OK; }
    z_stream stream;

private:
    bool ready;
};

}  // namespace

UploadDecoder::UploadDecoder(std::size_t maxDocumentBytes) : maxDocumentBytes(maxDocumentBytes) {}

void UploadDecoder::decode(const std::string& contentType, const std::string* part, bool gzipped,
                           UploadRecord& record) const {
    std::string boundary;
    if (!boundaryOf(contentType, boundary)) {
        refuse(record, kUnsupportedMediaType, "not a multipart/form-data body with a boundary");
        return;
    }
    const std::string expected = Statistics::kUploadBoundary;
    if (boundary.compare(0, expected.size(), expected) != 0) {
        refuse(record, kBadRequest,
               "multipart boundary \"" + boundary + "\" is not this build's (\"" + expected + "\")");
        return;
    }
    if (part == nullptr) {
        refuse(record, kBadRequest, "no \"data\" part in the multipart body");
        return;
    }
    std::string data = *part;
    unscramble(data);
    if (gzipped) {
        if (!gunzip(data, record.document, record)) {
            return;
        }
    } else if (data.size() > maxDocumentBytes) {
        refuse(record, kPayloadTooLarge,
               "document larger than " + std::to_string(maxDocumentBytes) + " bytes");
        return;
    } else {
        record.document = data;
    }
    if (readDocument(record)) {
        record.accepted = true;
        record.status = 200;
    }
}

bool UploadDecoder::boundaryOf(const std::string& contentType, std::string& boundary) {
    const std::size_t semicolon = contentType.find(';');
    std::string type = Text::trim(contentType.substr(0, semicolon));
    for (char& c : type) {
        c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    if (type != "multipart/form-data" || semicolon == std::string::npos) {
        return false;
    }
    std::string lower = contentType;
    for (char& c : lower) {
        c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    const std::size_t name = lower.find("boundary=", semicolon);
    if (name == std::string::npos) {
        return false;
    }
    std::string value = Text::trim(contentType.substr(name + 9, contentType.find(';', name) - name - 9));
    if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
        value = value.substr(1, value.size() - 2);
    }
    boundary = value;
    return !value.empty();
}

void UploadDecoder::unscramble(std::string& data) {
    for (std::size_t i = 0; i < data.size(); ++i) {
        data[i] = static_cast<char>(data[i] ^
                                    Statistics::kUploadScrambleKey[i % Statistics::kUploadScrambleKeyLength]);
    }
}

bool UploadDecoder::gunzip(const std::string& data, std::string& document, UploadRecord& record) const {
    if (data.size() < 2 || static_cast<unsigned char>(data[0]) != 0x1f ||
        static_cast<unsigned char>(data[1]) != 0x8b) {
        return refuse(record, kBadRequest, "data does not unscramble to gzip (scrambled with another key?)");
    }
    Inflater inflater;
    if (!inflater.init()) {
        return refuse(record, 500, "zlib cannot start");
    }
    z_stream& stream = inflater.stream;
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(data.data()));
    stream.avail_in = static_cast<uInt>(data.size());
    std::vector<char> buffer(64 * 1024);
    document.clear();
    for (;;) {
        stream.next_out = reinterpret_cast<Bytef*>(buffer.data());
        stream.avail_out = static_cast<uInt>(buffer.size());
        const int result = inflate(&stream, Z_NO_FLUSH);
        document.append(buffer.data(), buffer.size() - stream.avail_out);
        if (document.size() > maxDocumentBytes) {
            return refuse(record, kPayloadTooLarge,
                          "document larger than " + std::to_string(maxDocumentBytes) + " bytes");
        }
        if (result == Z_STREAM_END) {
            if (stream.avail_in == 0) {
                return true;
            }
            // Another gzip member follows, as gzip allows.
            if (inflateReset(&stream) != Z_OK) {
                return refuse(record, kBadRequest, "corrupt gzip data");
            }
            continue;
        }
        // With room for output, only missing input stops inflate.
        if (result == Z_BUF_ERROR) {
            return refuse(record, kBadRequest, "gzip data ends early");
        }
        if (result != Z_OK) {
            return refuse(
                record, kBadRequest,
                std::string("corrupt gzip data: ") + (stream.msg != nullptr ? stream.msg : "unknown"));
        }
    }
}

bool UploadDecoder::readDocument(UploadRecord& record) const {
    std::string error;
    if (record.document.find('\0') != std::string::npos) {
        return refuse(record, kBadRequest, "document holds a NUL byte");
    }
    // The collector's documents are small and nest five deep; the limits leave room for any
    // honest client while keeping a hostile body linear in time and memory.
    const Util::XmlLimits limits{maxDocumentBytes, static_cast<int>(kMaxDepth), 32, maxDocumentBytes / 2};
    TiXmlDocument document;
    if (!Util::XmlLoader::parse(record.document.data(), record.document.size(), limits, document, error)) {
        return refuse(record, kBadRequest, error);
    }
    const TiXmlElement* root = document.RootElement();
    if (root == nullptr || root->ValueStr() != "wifipool") {
        return refuse(record, kBadRequest, "the document's root is not <wifipool>");
    }
    record.uuid = attribute(root, "uuid");
    record.model = attribute(root, "model");
    for (const TiXmlElement* chunk = root->FirstChildElement("chunk"); chunk != nullptr;
         chunk = chunk->NextSiblingElement("chunk")) {
        ++record.chunks;
        record.chunkTypes.push_back(attribute(chunk, "type"));
        const TiXmlElement* bssids = chunk->FirstChildElement("bssids");
        for (const TiXmlElement* bssid = bssids != nullptr ? bssids->FirstChildElement("bssid") : nullptr;
             bssid != nullptr; bssid = bssid->NextSiblingElement("bssid")) {
            ++record.accessPoints;
        }
    }
    return true;
}

}  // namespace DevServer
