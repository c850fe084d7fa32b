// Reaches into each installed library: the platform layer, the HTTP engine
// and the core.
#include <KD/kd.h>

#include <cstdio>

#include "network/HttpRequest.h"
#include "util/UrlCoder.h"

int main() {
    const bool clockRuns = kdGetTimeUST() > 0;
    const bool requestMade = Network::HttpRequest::create("http://127.0.0.1/", "GET", 1000, false) != nullptr;
    std::printf("%s %d %d\n", Util::UrlCoder::urlEncodeString("a b&c").c_str(), clockRuns, requestMade);
    return clockRuns && requestMade ? 0 : 1;
}
