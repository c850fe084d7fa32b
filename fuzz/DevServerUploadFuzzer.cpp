// Wi-Fi pool uploads as the development server decodes them: the bytes of the
// "data" part through unscrambling, gunzip, the markup check and TinyXML.
// The first byte picks what the rest is: 0 the part as sent (scrambled gzip),
// 1 a gzip stream the target scrambles first, 2 an XML document the target
// scrambles and sends with gzip=0. Whatever the bytes, the record is
// consistent: accepted with status 200 and one type per chunk, or refused
// with a 4xx status and a reason.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "devserver/UploadDecoder.h"
#include "statistics/wifipool/UploadConstants.h"

namespace {

void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "mapcore fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

const std::size_t kMaxDocument = 1 << 20;

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) {
        return 0;
    }
    const int mode = data[0] % 3;
    std::string part(reinterpret_cast<const char*>(data) + 1, size - 1);
    if (mode != 0) {
        DevServer::UploadDecoder::unscramble(part);
    }
    std::string boundary;
    DevServer::UploadDecoder::boundaryOf(part, boundary);

    const DevServer::UploadDecoder decoder(kMaxDocument);
    DevServer::UploadRecord record;
    decoder.decode(std::string("multipart/form-data; boundary=") + Statistics::kUploadBoundary, &part,
                   mode != 2, record);
    if (record.accepted) {
        check(record.status == 200 && record.reason.empty(), "an accepted upload is answered 200");
        check(record.chunkTypes.size() == static_cast<std::size_t>(record.chunks), "one type per chunk");
        check(record.document.size() <= kMaxDocument, "a document within the limit");
    } else {
        check(record.status >= 400 && record.status < 500 && !record.reason.empty(),
              "a refusal is a 4xx status with a reason");
    }
    return 0;
}
