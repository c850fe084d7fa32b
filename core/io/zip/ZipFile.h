#pragma once

#include <minizip/unzip.h>

#include <boost/enable_shared_from_this.hpp>
#include <boost/noncopyable.hpp>
#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "io/zip/ZipEntry.h"

namespace IO {
namespace Zip {

// Reads a zip archive through an InputStream and opens its entries as streams. Always owned
// through a shared_ptr: entry streams that still read the archive keep it alive.
// Not thread-safe: one thread uses a zip file and its streams at a time.
class ZipFile : public boost::enable_shared_from_this<ZipFile>, private boost::noncopyable {
public:
    ZipFile();
    ~ZipFile();

    // Opens the archive. With preparedEntries (an index made earlier for the same archive)
    // the central directory is not read again and the index is copied. False, with an
    // assertion failure and one error line, when the archive cannot be read or its directory
    // claims more than the archive holds.
    bool init(boost::shared_ptr<InputStream> archive, const ZipEntryMap* preparedEntries);
    // The same with a prepared index that is shared rather than copied, so that opening an
    // entry of a large package costs no copy of its index.
    bool initWithIndex(boost::shared_ptr<InputStream> archive,
                       boost::shared_ptr<const ZipEntryMap> preparedEntries);

    // Exact, case-sensitive lookup; null when absent.
    const ZipEntry* findEntry(const std::string& name) const;
    const ZipEntryMap& getEntries() const { return *index; }
    boost::shared_ptr<const ZipEntryMap> getIndex() const { return index; }

    // A stored entry comes as a window of the archive stream whatever cached says; a compressed
    // one either inflated whole into memory (cached) or inflated while read (uncached, one at a
    // time per zip file). Empty, with an assertion failure, when the entry cannot be opened or its
    // sizes claim more than the archive can hold. Goes straight to the entry's directory record.
    boost::shared_ptr<InputStream> getInputStream(const ZipEntry& entry, bool cached);

private:
    friend class UncachedZipInputStream;

    bool open(boost::shared_ptr<InputStream> archive);
    bool buildIndex();
    bool readCurrentEntry(ZipEntry& entry);
    bool readCurrentTexts(ZipEntry& entry, unz_file_info64& info);
    // Makes entry minizip's current entry and opens it; false when it cannot be opened or claims
    // more than the archive holds.
    bool openCurrent(const ZipEntry& entry, long long& dataOffset);
    bool claimsFit(const ZipEntry& entry, long long dataOffset) const;
    // Reads the open current entry whole and closes it.
    boost::shared_ptr<InputStream> inflateWhole(const ZipEntry& entry);

    // Serves minizip's reads from a window of the archive read ahead.
    uLong readArchive(unsigned char* buffer, uLong size);

    static voidpf ZCALLBACK openFile(voidpf opaque, const void* filename, int mode);
    static uLong ZCALLBACK readFile(voidpf opaque, voidpf stream, void* buffer, uLong size);
    static uLong ZCALLBACK writeFile(voidpf opaque, voidpf stream, const void* buffer, uLong size);
    static ZPOS64_T ZCALLBACK tellFile(voidpf opaque, voidpf stream);
    static long ZCALLBACK seekFile(voidpf opaque, voidpf stream, ZPOS64_T offset, int origin);
    static int ZCALLBACK closeFile(voidpf opaque, voidpf stream);
    static int ZCALLBACK testError(voidpf opaque, voidpf stream);

    // Uncached entry streams open now (0 or 1): such a stream owns minizip's current entry.
    int openStreams = 0;
    boost::shared_ptr<InputStream> stream;
    long long archiveSize = 0;
    // minizip's position in the archive, and what was last read ahead from where.
    long long position = 0;
    std::vector<unsigned char> ahead;
    long long aheadStart = 0;
    unzFile file = nullptr;
    zlib_filefunc64_def functions;
    boost::shared_ptr<const ZipEntryMap> index;
};

}  // namespace Zip
}  // namespace IO
