#include "IoTest.h"

#include <algorithm>

#include "io/FileOutputStream.h"

int IoTest::claimAssertions() {
    std::vector<Assertion> recorded = assertions();
    for (const Assertion& assertion : recorded) {
        expectAssertion(assertion.expression);
    }
    return static_cast<int>(recorded.size());
}

IoTest::Bytes IoTest::pattern(size_t size, unsigned int seed) {
    Bytes bytes(size);
    unsigned int state = seed * 2654435761u + 1;
    for (size_t i = 0; i < size; ++i) {
        state = state * 1103515245u + 12345u;
        bytes[i] = static_cast<unsigned char>(state >> 16);
    }
    return bytes;
}

IoTest::Bytes IoTest::readAll(IO::InputStream& stream) {
    Bytes all;
    unsigned char chunk[100];
    int count = 0;
    while (stream.available() > 0 &&
           (count = stream.read(
                chunk, static_cast<int>(std::min<long long>(sizeof(chunk), stream.available())))) > 0) {
        all.insert(all.end(), chunk, chunk + count);
    }
    return all;
}

void IoTest::writeFile(const std::string& path, const Bytes& data) {
    IO::FileOutputStream out;
    ASSERT_TRUE(out.init(path.c_str())) << path;
    if (!data.empty()) {
        ASSERT_EQ(static_cast<int>(data.size()), out.write(data.data(), static_cast<int>(data.size())));
    }
}
