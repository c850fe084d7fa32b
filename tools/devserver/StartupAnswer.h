#pragma once

#include <string>

#include "devserver/Config.h"

namespace DevServer {

// The startup document: the client's uuid, every host the library asks for
// pointing back at this server (unless the config names another), and the
// statistics collector's feature switch with the config's periods. Any thread.
class StartupAnswer {
public:
    static std::string build(const Config& config, const std::string& baseUrl, const std::string& uuid);
};

}  // namespace DevServer
