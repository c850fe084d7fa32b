#pragma once

#include <boost/noncopyable.hpp>

#include "io/InputStream.h"

struct KDFile;

namespace IO {

// Reads a platform file; the size is taken when it is opened. Closes the file when destroyed.
// Not thread-safe: one thread uses a stream at a time.
class FileInputStream : public InputStream, private boost::noncopyable {
public:
    FileInputStream();
    ~FileInputStream() override;

    // False when the file cannot be opened for reading.
    bool init(const char* path);

    long long available() override;
    // A short read zero-fills the whole buffer, reports a bad state and returns the short count.
    int read(void* buffer, int length) override;
    long long tell() override;
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    KDFile* file = nullptr;
    long long size = 0;
};

}  // namespace IO
