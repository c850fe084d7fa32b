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
    // Where the entry's record lies in the central directory, so that opening the entry goes
    // straight there instead of searching the directory. Its local header (and so where its
    // data begins) is read only when the entry is opened.
    unsigned long long directoryPosition = 0;
    unsigned long long entryNumber = 0;
};

// An archive's index: entry name to entry, matched exactly.
typedef boost::unordered_map<std::string, ZipEntry> ZipEntryMap;

}  // namespace Zip
}  // namespace IO
