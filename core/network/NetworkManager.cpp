#include "network/NetworkManager.h"

#include "network/impl/NetworkManagerImpl.h"

namespace Network {

NetworkManager* NetworkManager::getInstance() {
    return Util::Singleton<NetworkManagerImpl>::getInstance();
}

}  // namespace Network
