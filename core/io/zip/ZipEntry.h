#pragma once

#include <boost/unordered_map.hpp>
#include <string>
#include <vector>

namespace IO {
namespace Zip {

// What the central directory says about one archive entry. A plain value; any thread.
struct ZipEntry {
    std::string name;
    std::string comment;
    // The entry's compression method is not 0 (stored).
    bool compressed = false;
    // The entry's central-directory extra field, as stored.
    std::vector<unsigned char> extra;
    unsigned int compressedSize = 0;
    unsigned int uncompressedSize = 0;
    // Position in the archive of the entry's first data byte, after its local header.
    long long dataOffset = 0;
};

// An archive's index: entry name to entry, matched exactly.
typedef boost::unordered_map<std::string, ZipEntry> ZipEntryMap;

}  // namespace Zip
}  // namespace IO
