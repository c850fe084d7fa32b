#pragma once

#include <boost/enable_shared_from_this.hpp>
#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <string>

#include "io/InputStream.h"
#include "io/resource/FileSystem.h"
#include "io/zip/ZipFile.h"

namespace IO {
namespace Resource {

// Opens one resource of a package over its own stream of the package file. A resource is one
// zip entry, or is split into the entry name, name.part001, name.part002 ... whose first entry
// carries an 8-byte central-directory extra field: total size, block size (both unsigned 32-bit
// little-endian). Always owned through a shared_ptr. Not thread-safe: one thread per resource.
class ResourceFile : public boost::enable_shared_from_this<ResourceFile>, private boost::noncopyable {
public:
    // Reads the package's central directory once; empty when the package cannot be read.
    static boost::shared_ptr<FileSystem> createFileSystem(boost::shared_ptr<InputStream> package);

    explicit ResourceFile(boost::shared_ptr<InputStream> package);

    // Opens the resource with the given name, at most once per ResourceFile. With an empty
    // fileSystem the package is indexed for this call. Empty when the resource is missing, or
    // when it is split and its parts do not hold the sizes its extra field claims.
    boost::shared_ptr<InputStream> openInputStream(const std::string& name,
                                                   boost::shared_ptr<FileSystem> fileSystem);
    // The stream of block index of the opened resource; empty when that part is missing.
    boost::shared_ptr<InputStream> openEntryStream(unsigned int index);

private:
    bool partsHold(const Zip::ZipEntry& first, unsigned int totalSize, unsigned int blockSize) const;
    std::string partName(unsigned int index) const;

    boost::shared_ptr<InputStream> stream;
    std::string name;
    boost::shared_ptr<Zip::ZipFile> file;
};

}  // namespace Resource
}  // namespace IO
