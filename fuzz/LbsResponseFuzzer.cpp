// Positioning server answers, as raw bytes of a 200 answer, through the parser
// that turns them into a Response. Whatever the bytes, a success carries a
// position on the globe and a finite accuracy.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "wireless/impl/LbsResponseParser.h"

namespace {

void check(bool holds, const char* promise) {
    if (!holds) {
        std::fprintf(stderr, "mapcore fuzz: broken promise: %s\n", promise);
        std::abort();
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::vector<unsigned char> body(data, data + size);
    const Wireless::LbsNetworkRequest::Response response =
        Wireless::LbsResponseParser::parse(body, 200, false);
    if (response.error == 0) {
        check(std::fabs(response.latitude) <= 90 && std::fabs(response.longitude) <= 180,
              "a success lies on the globe");
        check(std::isfinite(response.accuracy), "a success has a finite accuracy");
    }
    return 0;
}
