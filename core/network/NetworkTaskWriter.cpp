#include "network/NetworkTaskWriter.h"

namespace Network {

NetworkTaskWriter::NetworkTaskWriter() : closed(false), mutex(kdThreadMutexCreate(nullptr)) {}

NetworkTaskWriter::~NetworkTaskWriter() {
    kdThreadMutexFree(mutex);
}

void NetworkTaskWriter::write(const void* data, int size) {
    kdThreadMutexLock(mutex);
    KD_ASSERT(!closed);
    if (!closed && data != nullptr && size > 0) {
        const char* bytes = static_cast<const char*>(data);
        buffer.insert(buffer.end(), bytes, bytes + size);
        if (request) {
            request->getBodyStream()->write(bytes, static_cast<unsigned int>(size));
        }
    }
    kdThreadMutexUnlock(mutex);
}

void NetworkTaskWriter::close() {
    kdThreadMutexLock(mutex);
    KD_ASSERT(!closed);
    if (!closed) {
        if (request) {
            request->getBodyStream()->closeWrite();
        }
        closed = true;
    }
    kdThreadMutexUnlock(mutex);
}

void NetworkTaskWriter::setRequest(boost::shared_ptr<HttpRequest> newRequest) {
    kdThreadMutexLock(mutex);
    request = newRequest;
    if (request && !buffer.empty()) {
        request->getBodyStream()->write(buffer.data(), static_cast<unsigned int>(buffer.size()));
    }
    if (request && closed) {
        request->getBodyStream()->closeWrite();
    }
    kdThreadMutexUnlock(mutex);
}

}  // namespace Network
