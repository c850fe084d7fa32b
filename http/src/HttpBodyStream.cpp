#include <cstring>

#include "HttpTransfer.h"
#include "network/HttpRequest.h"

namespace Network {

HttpRequest::HttpBodyStream::HttpBodyStream() : mutex(kdThreadMutexCreate(nullptr)), closed(false) {}

HttpRequest::HttpBodyStream::~HttpBodyStream() {
    kdThreadMutexFree(mutex);
}

void HttpRequest::HttpBodyStream::write(const char* bytes, unsigned int size) {
    kdThreadMutexLock(mutex);
    KD_ASSERT(!closed);
    if (!closed && size > 0) {
        data.append(bytes, size);
    }
    kdThreadMutexUnlock(mutex);
    notifyReaders();
}

void HttpRequest::HttpBodyStream::closeWrite() {
    kdThreadMutexLock(mutex);
    KD_ASSERT(!closed);
    closed = true;
    kdThreadMutexUnlock(mutex);
    notifyReaders();
}

std::size_t HttpRequest::HttpBodyStream::read(std::size_t offset, char* buffer, std::size_t capacity,
                                              bool& ended) {
    kdThreadMutexLock(mutex);
    std::size_t available = offset < data.size() ? data.size() - offset : 0;
    std::size_t count = available < capacity ? available : capacity;
    std::memcpy(buffer, data.data() + offset, count);
    ended = closed && count == available;
    kdThreadMutexUnlock(mutex);
    return count;
}

bool HttpRequest::HttpBodyStream::getClosedSize(std::size_t& size) {
    kdThreadMutexLock(mutex);
    bool result = closed;
    size = data.size();
    kdThreadMutexUnlock(mutex);
    return result;
}

void HttpRequest::HttpBodyStream::addReader(const boost::weak_ptr<HttpTransfer>& reader) {
    kdThreadMutexLock(mutex);
    readers.push_back(reader);
    kdThreadMutexUnlock(mutex);
}

void HttpRequest::HttpBodyStream::notifyReaders() {
    // The readers wake the engine thread, which is not done under our lock.
    std::vector<boost::shared_ptr<HttpTransfer> > live;
    kdThreadMutexLock(mutex);
    for (std::size_t i = 0; i < readers.size();) {
        boost::shared_ptr<HttpTransfer> reader = readers[i].lock();
        if (reader) {
            live.push_back(reader);
            ++i;
        } else {
            readers.erase(readers.begin() + i);
        }
    }
    kdThreadMutexUnlock(mutex);
    for (const boost::shared_ptr<HttpTransfer>& reader : live) {
        reader->onBodyAvailable();
    }
}

}  // namespace Network
