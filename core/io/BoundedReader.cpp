#include "io/BoundedReader.h"

#include <algorithm>

#include "io/InputStream.h"

namespace IO {

namespace {

// Each step allocates at most this much beyond what has arrived.
const long long kStep = 64 * 1024;

// The bytes to ask for next: no more than the stream says it has (streams report a read past
// their end as a fault), than one step, or than is still wanted.
std::size_t nextRequest(InputStream& stream, std::size_t wanted) {
    const long long left = stream.available();
    if (left <= 0) {
        return 0;
    }
    const std::size_t step = static_cast<std::size_t>(std::min<long long>(left, kStep));
    return std::min(step, wanted);
}

// Appends up to request bytes; the number that arrived.
std::size_t appendFrom(InputStream& stream, std::size_t request, std::vector<char>& out) {
    const std::size_t start = out.size();
    out.resize(start + request);
    const int got = stream.read(out.data() + start, static_cast<int>(request));
    const std::size_t arrived = got > 0 ? static_cast<std::size_t>(got) : 0;
    out.resize(start + arrived);
    return arrived;
}

}  // namespace

BoundedReader::Result BoundedReader::readAll(InputStream& stream, std::size_t limit, std::vector<char>& out) {
    const std::size_t start = out.size();
    for (;;) {
        const std::size_t taken = out.size() - start;
        const std::size_t request = nextRequest(stream, limit - taken + 1);
        if (request == 0 || appendFrom(stream, request, out) == 0) {
            return Complete;
        }
        if (out.size() - start > limit) {
            return TooLong;
        }
    }
}

bool BoundedReader::readExactly(InputStream& stream, std::size_t length, std::vector<char>& out) {
    out.clear();
    while (out.size() < length) {
        const std::size_t request = nextRequest(stream, length - out.size());
        if (request == 0 || appendFrom(stream, request, out) < request) {
            out.clear();
            return false;
        }
    }
    return true;
}

}  // namespace IO
