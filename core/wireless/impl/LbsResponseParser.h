#pragma once

#include <vector>

#include "wireless/LbsNetworkRequest.h"

namespace Wireless {

// Turns the positioning server's answer into a Response. The answer is
// untrusted: anything malformed gives error 1, never made-up coordinates.
// Stateless; any thread.
class LbsResponseParser {
public:
    // body: what a 2xx answer carried; code: the task's finish code;
    // errorBodyAnnounced: an answer outside 2xx came with a body (which the
    // network manager does not pass on).
    static LbsNetworkRequest::Response parse(const std::vector<unsigned char>& body, int code,
                                             bool errorBodyAnnounced);
};

}  // namespace Wireless
