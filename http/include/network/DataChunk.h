#pragma once

#include <cstddef>
#include <vector>

namespace Network {

// A block of response body bytes. It is the byte vector itself, so a receiver
// may read it or take its contents with swap. Handed whole from the engine
// thread to one receiver; not shared while being changed.
class DataChunk : public std::vector<unsigned char> {
public:
    DataChunk() {}
    DataChunk(const unsigned char* data, std::size_t size) : std::vector<unsigned char>(data, data + size) {}
};

}  // namespace Network
