// Startup answers, as raw bytes of the body, parsed as the startup request
// parses them and read by the default listener into a fresh StartupData.
// Whatever the bytes, every host it keeps is an http or https URL ending in
// "/".
#include <tinyxml.h>

#include <cstddef>
#include <cstdint>
#include <vector>

#include "FuzzSupport.h"
#include "startup/StartupData.h"
#include "startup/impl/DefaultStartupListener.h"
#include "util/XmlUtils.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    const std::vector<unsigned char> body(data, data + size);
    TiXmlDocument document;
    if (!Util::XmlUtils::load(body, false, document)) {
        return 0;
    }
    Startup::StartupData startupData;
    Startup::DefaultStartupListener(&startupData).parseStartup(document);
    for (const auto& host : startupData.hosts) {
        const std::string& url = host.second;
        fuzz::check(url.compare(0, 7, "http://") == 0 || url.compare(0, 8, "https://") == 0,
                    "a kept host is an http or https URL");
        fuzz::check(url[url.size() - 1] == '/', "a kept host ends with a slash");
    }
    return 0;
}
