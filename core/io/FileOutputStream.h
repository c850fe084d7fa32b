#pragma once

#include <boost/noncopyable.hpp>

#include "io/OutputStream.h"

struct KDFile;

namespace IO {

// Writes a platform file, created or truncated when opened. Closes the file when destroyed.
// Not thread-safe: one thread uses a stream at a time.
class FileOutputStream : public OutputStream, private boost::noncopyable {
public:
    FileOutputStream();
    ~FileOutputStream() override;

    // Creates the missing folders of the path first. False when the file cannot be opened.
    bool init(const char* path);

    // Returns the platform's count; a short write is not reported otherwise.
    int write(const void* data, int length) override;

private:
    KDFile* file = nullptr;
};

}  // namespace IO
