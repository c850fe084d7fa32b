#pragma once

#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>

#include "io/InputStream.h"
#include "io/zip/ZipEntry.h"

namespace IO {
namespace Zip {

class ZipFile;

// Inflates a compressed entry while it is read; cannot seek. Holds minizip's current entry of
// its zip file, so no other entry stream of that file can be opened while it lives.
// Not thread-safe: the zip file's thread only.
class UncachedZipInputStream : public InputStream, private boost::noncopyable {
public:
    // Takes over the zip file's current entry, which must be the entry and open.
    UncachedZipInputStream(boost::shared_ptr<ZipFile> file, const ZipEntry& entry);
    ~UncachedZipInputStream() override;

    long long available() override;
    // Returns what minizip delivers: short at the end, negative on a corrupt entry; either is a
    // bad state (an exception once exceptions are enabled).
    int read(void* buffer, int length) override;
    long long tell() override;
    void seek(long long offset, KDfileSeekOrigin origin) override;

private:
    boost::shared_ptr<ZipFile> file;
    ZipEntry entry;
    long long position = 0;
};

}  // namespace Zip
}  // namespace IO
