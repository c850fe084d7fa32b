#pragma once

#include <boost/noncopyable.hpp>
#include <boost/scoped_ptr.hpp>
#include <boost/shared_ptr.hpp>
#include <boost/unordered_set.hpp>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "io/OutputStream.h"
#include "io/zip/ZipOutputStream.h"

namespace IO {
namespace Resource {

// Writes a resource package that ResourceFile reads: a zip archive with one entry per
// resource, each stored or deflated. A resource larger than the block size is split into
// name, name.part001, name.part002 ... of block-size bytes (the last holds the rest), the
// first carrying the 8-byte extra field (total size, block size). The archive is built in
// memory and reaches out in finish(). Not thread-safe: one thread uses a builder.
class PackageBuilder : private boost::noncopyable {
public:
    // blockSize 0 never splits.
    PackageBuilder(boost::shared_ptr<OutputStream> out, unsigned int blockSize);
    // Finishes the package if finish() was not called.
    ~PackageBuilder();

    // Adds a resource. False, with nothing added, when the name is empty, already used by a
    // resource or a part, or (with its part suffix) longer than 255 bytes, or the data is larger
    // than 4 GiB - 1.
    bool addResource(const std::string& name, const void* data, size_t size, bool compressed);
    // Adds everything data has left; false, with nothing added, when it cannot all be read.
    bool addResource(const std::string& name, InputStream& data, bool compressed);
    // Adds every file under dir (recursively), named by its path below dir with '/' separators.
    // Files ending in one of storedSuffixes are stored, the others deflated when compressed.
    // Returns the number of resources added, or -1 when a file failed (those before it stay).
    int addDirectory(const char* dir, bool compressed, const std::vector<std::string>& storedSuffixes);

    // Writes the finished package to out. Nothing may be added afterwards.
    void finish();

private:
    bool claimNames(const std::string& name, unsigned int blockCount);
    void writeEntry(const std::string& name, const unsigned char* data, unsigned int size, bool compressed,
                    const std::vector<unsigned char>& extra);

    boost::scoped_ptr<Zip::ZipOutputStream> zip;
    unsigned int blockSize;
    boost::unordered_set<std::string> entryNames;
};

}  // namespace Resource
}  // namespace IO
