// Device and network values (model, request path, network name and BSSID,
// operator) of any bytes through the upload document: the document must stay
// well-formed. The same bytes also go as a startup answer through the
// collector feature's parser.
#include <tinyxml.h>

#include <boost/make_shared.hpp>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "statistics/wifipool/BssidTag.h"
#include "statistics/wifipool/BssidsTag.h"
#include "statistics/wifipool/CellInfoTag.h"
#include "statistics/wifipool/NetworkCollectorWrapper.h"
#include "statistics/wifipool/RequestInfoTag.h"
#include "statistics/wifipool/WifiPoolTag.h"

namespace {

using namespace Statistics;

// The input split at NUL bytes; missing fields are empty.
std::vector<std::string> fields(const uint8_t* data, size_t size, size_t count) {
    std::vector<std::string> out(count);
    size_t field = 0;
    for (size_t i = 0; i < size && field < count; ++i) {
        if (data[i] == 0) {
            ++field;
        } else {
            out[field] += static_cast<char>(data[i]);
        }
    }
    return out;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    std::vector<std::string> values = fields(data, size, 5);

    boost::shared_ptr<WifiPoolTag> root = boost::make_shared<WifiPoolTag>();
    root->setModel(values[0]);
    boost::shared_ptr<RequestInfo> request = boost::make_shared<RequestInfo>();
    request->path = values[1];
    root->addChild(boost::make_shared<RequestInfoTag>(request));
    boost::shared_ptr<BssidsTag> bssids = boost::make_shared<BssidsTag>();
    bssids->addChild(boost::make_shared<BssidTag>(values[2], values[3], 0, -50));
    root->addChild(bssids);
    root->addChild(boost::make_shared<CellInfoTag>(1, 2, values[4], values[0], -3));
    std::string document = "<?xml version=\"1.0\" encoding=\"windows-1251\" ?>\n";
    root->appendContent(document);

    TiXmlDocument parsed;
    parsed.Parse(document.c_str());
    if (parsed.Error() || parsed.RootElement() == nullptr) {
        std::abort();
    }

    // Kept for the whole process and never destroyed: at exit the platform's
    // thread record is gone before static destructors would run.
    static boost::shared_ptr<NetworkCollectorWrapper>* feature =
        new boost::shared_ptr<NetworkCollectorWrapper>(boost::make_shared<NetworkCollectorWrapper>());
    TiXmlDocument answer;
    answer.Parse(std::string(reinterpret_cast<const char*>(data), size).c_str());
    (*feature)->parseStartup(answer);
    return 0;
}
