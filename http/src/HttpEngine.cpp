#include "network/HttpEngine.h"

#include "HttpEngineCore.h"

namespace Network {

HttpEngine::HttpEngine() : core(HttpEngineCore::acquire()) {}

HttpEngine::~HttpEngine() {
    core.reset();
    HttpEngineCore::release();
}

}  // namespace Network
