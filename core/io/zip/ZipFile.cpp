#include "io/zip/ZipFile.h"

#include <algorithm>
#include <boost/make_shared.hpp>
#include <climits>
#include <cstring>
#include <new>
#include <vector>

#include "io/BufferInputStream.h"
#include "io/zip/impl/StoredZipInputStream.h"
#include "io/zip/impl/UncachedZipInputStream.h"
#include "util/Logger.h"

namespace IO {
namespace Zip {

namespace {

// Deflate's densest form carries about 1032 output bytes per input byte.
const unsigned long long kMaxDeflateRatio = 1032;

// The fixed part of a central directory record; its name, extra field and comment follow.
const unsigned long long kDirectoryRecordSize = 46;

// minizip reads a directory record in many small pieces; they come from this much read ahead.
const size_t kReadAhead = 16 * 1024;

ZipFile* asZip(voidpf opaque) {
    return static_cast<ZipFile*>(opaque);
}

}  // namespace

ZipFile::ZipFile() {}

ZipFile::~ZipFile() {
    if (file) {
        unzClose(file);
    }
}

voidpf ZCALLBACK ZipFile::openFile(voidpf opaque, const void* filename, int) {
    // minizip needs a file name; the archive is always opened under this one.
    KD_ASSERT(kdStrcmp(static_cast<const char*>(filename), "res") == 0);
    asZip(opaque)->position = 0;
    return opaque;
}

uLong ZCALLBACK ZipFile::readFile(voidpf, voidpf zip, void* buffer, uLong size) {
    return asZip(zip)->readArchive(static_cast<unsigned char*>(buffer), size);
}

uLong ZipFile::readArchive(unsigned char* buffer, uLong size) {
    // minizip asks past the end only on a damaged archive and handles a short read itself; the
    // stream must not see it as a bad state (that would assert, or throw through C code). The
    // stream is positioned before every read of it: entry windows share it and move it.
    uLong done = 0;
    while (done < size && position < archiveSize) {
        const unsigned long long wanted = std::min<unsigned long long>(
            size - done, static_cast<unsigned long long>(archiveSize - position));
        if (position >= aheadStart && position < aheadStart + static_cast<long long>(ahead.size())) {
            const size_t at = static_cast<size_t>(position - aheadStart);
            const size_t count = static_cast<size_t>(std::min<unsigned long long>(wanted, ahead.size() - at));
            std::memcpy(buffer + done, ahead.data() + at, count);
            done += count;
            position += count;
            continue;
        }
        if (wanted >= kReadAhead) {
            stream->seek(position, KD_SEEK_SET);
            const int count =
                stream->read(buffer + done, static_cast<int>(std::min<unsigned long long>(wanted, INT_MAX)));
            if (count <= 0) {
                break;
            }
            done += count;
            position += count;
            continue;
        }
        // Aligned windows: minizip looks for the end records backwards in small steps, which
        // a window starting at each request would miss every time.
        aheadStart = position - position % static_cast<long long>(kReadAhead);
        stream->seek(aheadStart, KD_SEEK_SET);
        ahead.resize(static_cast<size_t>(std::min<long long>(kReadAhead, archiveSize - aheadStart)));
        const int count = stream->read(ahead.data(), static_cast<int>(ahead.size()));
        ahead.resize(count > 0 ? count : 0);
        if (position >= aheadStart + static_cast<long long>(ahead.size())) {
            break;
        }
    }
    return done;
}

uLong ZCALLBACK ZipFile::writeFile(voidpf, voidpf, const void*, uLong) {
    KD_ASSERT(false);
    return static_cast<uLong>(-1);
}

ZPOS64_T ZCALLBACK ZipFile::tellFile(voidpf, voidpf zip) {
    return static_cast<ZPOS64_T>(asZip(zip)->position);
}

long ZCALLBACK ZipFile::seekFile(voidpf, voidpf zip, ZPOS64_T offset, int origin) {
    ZipFile* self = asZip(zip);
    long long target = static_cast<long long>(offset);
    switch (origin) {
        case ZLIB_FILEFUNC_SEEK_SET:
            break;
        case ZLIB_FILEFUNC_SEEK_CUR:
            target += self->position;
            break;
        case ZLIB_FILEFUNC_SEEK_END:
            target += self->archiveSize;
            break;
        default:
            return -1;
    }
    if (target < 0) {
        return -1;
    }
    self->position = target;
    return 0;
}

int ZCALLBACK ZipFile::closeFile(voidpf, voidpf) {
    return 0;
}

int ZCALLBACK ZipFile::testError(voidpf, voidpf) {
    return 0;
}

bool ZipFile::init(boost::shared_ptr<InputStream> archive, const ZipEntryMap* preparedEntries) {
    if (!open(archive)) {
        return false;
    }
    if (preparedEntries) {
        index = boost::make_shared<const ZipEntryMap>(*preparedEntries);
        return true;
    }
    return buildIndex();
}

bool ZipFile::initWithIndex(boost::shared_ptr<InputStream> archive,
                            boost::shared_ptr<const ZipEntryMap> preparedEntries) {
    KD_ASSERT(preparedEntries);
    if (!preparedEntries || !open(archive)) {
        return false;
    }
    index = preparedEntries;
    return true;
}

bool ZipFile::open(boost::shared_ptr<InputStream> archive) {
    KD_ASSERT(!file);
    index = boost::make_shared<const ZipEntryMap>();
    stream = archive;
    archiveSize = stream->tell() + stream->available();
    functions.zopen64_file = &ZipFile::openFile;
    functions.zread_file = &ZipFile::readFile;
    functions.zwrite_file = &ZipFile::writeFile;
    functions.ztell64_file = &ZipFile::tellFile;
    functions.zseek64_file = &ZipFile::seekFile;
    functions.zclose_file = &ZipFile::closeFile;
    functions.zerror_file = &ZipFile::testError;
    functions.opaque = this;

    file = unzOpen2_64("res", &functions);
    if (!file) {
        Logger::log(Logger::Error, "ZipFile: not a zip archive (%lld bytes)", archiveSize);
        KD_ASSERT(false);
        return false;
    }
    return true;
}

bool ZipFile::buildIndex() {
    unz_global_info64 info;
    if (unzGetGlobalInfo64(file, &info) != UNZ_OK) {
        Logger::log(Logger::Error, "ZipFile: the central directory cannot be read");
        KD_ASSERT(false);
        return false;
    }
    boost::shared_ptr<ZipEntryMap> entries = boost::make_shared<ZipEntryMap>();
    // The count is a claim; a directory record takes at least this much of the archive.
    entries->reserve(static_cast<size_t>(
        std::min<unsigned long long>(info.number_entry, archiveSize / kDirectoryRecordSize)));
    for (ZPOS64_T i = 0; i < info.number_entry; ++i) {
        int result = i == 0 ? unzGoToFirstFile(file) : unzGoToNextFile(file);
        ZipEntry entry;
        if (result != UNZ_OK || !readCurrentEntry(entry)) {
            // One line for the whole archive: it is refused here, not entry by entry.
            Logger::log(
                Logger::Error, "ZipFile: directory record %llu of %llu is damaged or runs past the archive",
                static_cast<unsigned long long>(i + 1), static_cast<unsigned long long>(info.number_entry));
            KD_ASSERT(false);
            return false;
        }
        const std::string name = entry.name;
        (*entries)[name] = std::move(entry);
    }
    index = entries;
    return true;
}

bool ZipFile::readCurrentEntry(ZipEntry& entry) {
    // Most entries fit these buffers and are read in one call; a longer name, extra field or
    // any comment is read again at its full length (a cut name would be unterminated).
    unz64_file_pos position;
    unz_file_info64 info;
    char name[256];
    unsigned char extra[64];
    if (unzGetFilePos64(file, &position) != UNZ_OK ||
        unzGetCurrentFileInfo64(file, &info, name, sizeof(name), extra, sizeof(extra), nullptr, 0) !=
            UNZ_OK) {
        return false;
    }
    // The three lengths are claims: the texts are read at their full length only when the record
    // could hold them.
    const unsigned long long recordEnd = position.pos_in_zip_directory + kDirectoryRecordSize +
                                         info.size_filename + info.size_file_extra + info.size_file_comment;
    if (recordEnd > static_cast<unsigned long long>(archiveSize)) {
        return false;
    }
    if (info.size_filename < sizeof(name) && info.size_file_extra <= sizeof(extra) &&
        info.size_file_comment == 0) {
        entry.name.assign(name, info.size_filename);
        entry.extra.assign(extra, extra + info.size_file_extra);
    } else if (!readCurrentTexts(entry, info)) {
        return false;
    }
    entry.compressed = info.compression_method != 0;
    entry.compressedSize = static_cast<unsigned int>(info.compressed_size);
    entry.uncompressedSize = static_cast<unsigned int>(info.uncompressed_size);
    entry.directoryPosition = position.pos_in_zip_directory;
    entry.entryNumber = position.num_of_file;
    return true;
}

bool ZipFile::readCurrentTexts(ZipEntry& entry, unz_file_info64& info) {
    std::vector<char> name(info.size_filename + 1);
    entry.extra.resize(info.size_file_extra);
    std::vector<char> comment(info.size_file_comment + 1);
    if (unzGetCurrentFileInfo64(file, &info, name.data(), name.size(), entry.extra.data(), entry.extra.size(),
                                comment.data(), comment.size()) != UNZ_OK) {
        return false;
    }
    entry.name.assign(name.data(), info.size_filename);
    entry.comment.assign(comment.data(), info.size_file_comment);
    return true;
}

const ZipEntry* ZipFile::findEntry(const std::string& name) const {
    ZipEntryMap::const_iterator it = index->find(name);
    return it == index->end() ? nullptr : &it->second;
}

boost::shared_ptr<InputStream> ZipFile::getInputStream(const ZipEntry& entry, bool cached) {
    if (openStreams != 0) {
        KD_ASSERT(false);
        return boost::shared_ptr<InputStream>();
    }
    long long dataOffset = 0;
    if (!openCurrent(entry, dataOffset)) {
        KD_ASSERT(false);
        return boost::shared_ptr<InputStream>();
    }
    if (!entry.compressed) {
        unzCloseCurrentFile(file);
        return boost::shared_ptr<InputStream>(
            new StoredZipInputStream(shared_from_this(), stream, dataOffset, entry.uncompressedSize));
    }
    if (cached) {
        return inflateWhole(entry);
    }
    return boost::shared_ptr<InputStream>(new UncachedZipInputStream(shared_from_this(), entry));
}

bool ZipFile::openCurrent(const ZipEntry& entry, long long& dataOffset) {
    unz64_file_pos position = {entry.directoryPosition, entry.entryNumber};
    // A stored entry is read through a window of the archive; only where its data begins is
    // wanted, so it is opened raw.
    if (unzGoToFilePos64(file, &position) != UNZ_OK ||
        unzOpenCurrentFile2(file, nullptr, nullptr, entry.compressed ? 0 : 1) != UNZ_OK) {
        return false;
    }
    dataOffset = static_cast<long long>(unzGetCurrentFileZStreamPos64(file));
    if (claimsFit(entry, dataOffset)) {
        return true;
    }
    Logger::log(Logger::Error, "ZipFile: entry %s claims more data than the archive holds",
                entry.name.c_str());
    unzCloseCurrentFile(file);
    return false;
}

bool ZipFile::claimsFit(const ZipEntry& entry, long long dataOffset) const {
    // Sizes from the directory are claims: nothing is sized from them unless the archive could
    // hold that much.
    if (dataOffset < 0 || dataOffset > archiveSize || entry.compressedSize > archiveSize - dataOffset) {
        return false;
    }
    if (!entry.compressed) {
        return entry.compressedSize == entry.uncompressedSize;
    }
    return entry.uncompressedSize <= kMaxDeflateRatio * entry.compressedSize;
}

boost::shared_ptr<InputStream> ZipFile::inflateWhole(const ZipEntry& entry) {
    unsigned char* bytes = entry.uncompressedSize <= INT_MAX
                               ? new (std::nothrow) unsigned char[entry.uncompressedSize]
                               : nullptr;
    int count = bytes ? unzReadCurrentFile(file, bytes, entry.uncompressedSize) : -1;
    // Closing checks the CRC. A short or damaged entry must not be handed out: the caller
    // would read uninitialised or corrupt bytes as the resource.
    bool complete = unzCloseCurrentFile(file) == UNZ_OK && count == static_cast<int>(entry.uncompressedSize);
    if (!complete) {
        KD_ASSERT(false);
        delete[] bytes;
        return boost::shared_ptr<InputStream>();
    }
    return boost::shared_ptr<InputStream>(
        new BufferInputStream<unsigned char>(bytes, static_cast<int>(entry.uncompressedSize)));
}

}  // namespace Zip
}  // namespace IO
