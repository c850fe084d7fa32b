#pragma once

#include <google/protobuf/io/zero_copy_stream.h>

#include <cstdint>
#include <vector>

namespace IO {
class InputStream;
}

namespace Util {

// Feeds a protobuf parser from one of our streams. The whole stream is read when constructed
// and handed out in one piece. One thread uses it.
class ProtobufStreamCallbacks : public google::protobuf::io::ZeroCopyInputStream {
public:
    // Reads everything stream has left; stream is only borrowed during construction.
    explicit ProtobufStreamCallbacks(IO::InputStream* stream);

    // Everything not yet consumed; false when nothing is left.
    bool Next(const void** data, int* size) override;
    // Gives back the last count bytes of the piece the last Next returned.
    void BackUp(int count) override;
    // False when fewer than count bytes are left; everything left is then consumed.
    bool Skip(int count) override;
    int64_t ByteCount() const override;

private:
    std::vector<unsigned char> buffer;
    int position = 0;
    int lastReturnedSize = 0;
};

}  // namespace Util
