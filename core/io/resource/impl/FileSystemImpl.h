#pragma once

#include <boost/shared_ptr.hpp>

#include "io/resource/FileSystem.h"
#include "io/zip/ZipEntry.h"

namespace IO {
namespace Resource {

// The package index: entry name to entry, filled once from the central directory and never
// changed afterwards, so any thread may read it.
class FileSystemImpl : public FileSystem {
public:
    explicit FileSystemImpl(boost::shared_ptr<const Zip::ZipEntryMap> entries) : entries(entries) {}

    // Shared with the zip readers of the resources opened from it.
    boost::shared_ptr<const Zip::ZipEntryMap> getEntries() const { return entries; }

private:
    const boost::shared_ptr<const Zip::ZipEntryMap> entries;
};

}  // namespace Resource
}  // namespace IO
