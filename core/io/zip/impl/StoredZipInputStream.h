#pragma once

#include <boost/shared_ptr.hpp>

#include "io/WrappedInputStream.h"

namespace IO {
namespace Zip {

class ZipFile;

// A stored (uncompressed) entry read straight from its window of the archive stream; keeps the
// zip file, and so the archive, alive. Not thread-safe: the zip file's thread only.
class StoredZipInputStream : public WrappedInputStream {
public:
    StoredZipInputStream(boost::shared_ptr<ZipFile> file, boost::shared_ptr<InputStream> archive,
                         long long offset, long long size)
        : WrappedInputStream(archive, offset, size), file(file) {}

private:
    boost::shared_ptr<ZipFile> file;
};

}  // namespace Zip
}  // namespace IO
