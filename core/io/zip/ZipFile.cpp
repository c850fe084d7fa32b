#include "io/zip/ZipFile.h"

#include <boost/make_shared.hpp>
#include <climits>
#include <new>
#include <vector>

#include "io/BufferInputStream.h"
#include "io/zip/impl/StoredZipInputStream.h"
#include "io/zip/impl/UncachedZipInputStream.h"

namespace IO {
namespace Zip {

namespace {

InputStream* asStream(voidpf stream) {
    return static_cast<InputStream*>(stream);
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
    asStream(opaque)->seek(0, KD_SEEK_SET);
    return opaque;
}

uLong ZCALLBACK ZipFile::readFile(voidpf, voidpf stream, void* buffer, uLong size) {
    // minizip asks past the end only on a damaged archive and handles a short read itself; the
    // stream must not see it as a bad state (that would assert, or throw through C code).
    long long left = asStream(stream)->available();
    if (left <= 0) {
        return 0;
    }
    if (static_cast<unsigned long long>(left) < size) {
        size = static_cast<uLong>(left);
    }
    if (size > INT_MAX) {
        size = INT_MAX;
    }
    int count = asStream(stream)->read(buffer, static_cast<int>(size));
    return count > 0 ? static_cast<uLong>(count) : 0;
}

uLong ZCALLBACK ZipFile::writeFile(voidpf, voidpf, const void*, uLong) {
    KD_ASSERT(false);
    return static_cast<uLong>(-1);
}

ZPOS64_T ZCALLBACK ZipFile::tellFile(voidpf, voidpf stream) {
    return static_cast<ZPOS64_T>(asStream(stream)->tell());
}

long ZCALLBACK ZipFile::seekFile(voidpf, voidpf stream, ZPOS64_T offset, int origin) {
    // minizip numbers its origins as the platform does.
    asStream(stream)->seek(static_cast<long long>(offset), static_cast<KDfileSeekOrigin>(origin));
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
    functions.zopen64_file = &ZipFile::openFile;
    functions.zread_file = &ZipFile::readFile;
    functions.zwrite_file = &ZipFile::writeFile;
    functions.ztell64_file = &ZipFile::tellFile;
    functions.zseek64_file = &ZipFile::seekFile;
    functions.zclose_file = &ZipFile::closeFile;
    functions.zerror_file = &ZipFile::testError;
    functions.opaque = stream.get();

    file = unzOpen2_64("res", &functions);
    if (!file) {
        KD_ASSERT(false);
        return false;
    }
    return true;
}

bool ZipFile::buildIndex() {
    unz_global_info64 info;
    if (unzGetGlobalInfo64(file, &info) != UNZ_OK) {
        KD_ASSERT(false);
        return false;
    }
    boost::shared_ptr<ZipEntryMap> entries = boost::make_shared<ZipEntryMap>();
    for (ZPOS64_T i = 0; i < info.number_entry; ++i) {
        int result = i == 0 ? unzGoToFirstFile(file) : unzGoToNextFile(file);
        if (result != UNZ_OK) {
            KD_ASSERT(false);
            return false;
        }
        ZipEntry entry;
        if (!readCurrentEntry(entry)) {
            KD_ASSERT(false);
            return false;
        }
        (*entries)[entry.name] = entry;
    }
    index = entries;
    return true;
}

bool ZipFile::readCurrentEntry(ZipEntry& entry) {
    // Sizes first, then every text at its full length: a fixed name buffer would cut long names
    // and leave them unterminated.
    unz_file_info64 info;
    if (unzGetCurrentFileInfo64(file, &info, nullptr, 0, nullptr, 0, nullptr, 0) != UNZ_OK) {
        return false;
    }
    std::vector<char> name(info.size_filename + 1);
    entry.extra.resize(info.size_file_extra);
    std::vector<char> comment(info.size_file_comment + 1);
    if (unzGetCurrentFileInfo64(file, &info, name.data(), name.size(), entry.extra.data(), entry.extra.size(),
                                comment.data(), comment.size()) != UNZ_OK) {
        return false;
    }
    entry.name.assign(name.data(), info.size_filename);
    entry.comment.assign(comment.data(), info.size_file_comment);
    entry.compressed = info.compression_method != 0;
    entry.compressedSize = static_cast<unsigned int>(info.compressed_size);
    entry.uncompressedSize = static_cast<unsigned int>(info.uncompressed_size);

    if (unzOpenCurrentFile(file) != UNZ_OK) {
        return false;
    }
    entry.dataOffset = static_cast<long long>(unzGetCurrentFileZStreamPos64(file));
    return unzCloseCurrentFile(file) == UNZ_OK;
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
    if (!entry.compressed) {
        return boost::shared_ptr<InputStream>(
            new StoredZipInputStream(shared_from_this(), stream, entry.dataOffset, entry.uncompressedSize));
    }
    if (unzLocateFile(file, entry.name.c_str(), 1) != UNZ_OK) {
        KD_ASSERT(false);
        return boost::shared_ptr<InputStream>();
    }
    if (cached) {
        return inflateWhole(entry);
    }
    return boost::shared_ptr<InputStream>(new UncachedZipInputStream(shared_from_this(), entry));
}

boost::shared_ptr<InputStream> ZipFile::inflateWhole(const ZipEntry& entry) {
    if (entry.uncompressedSize > INT_MAX || unzOpenCurrentFile(file) != UNZ_OK) {
        KD_ASSERT(false);
        return boost::shared_ptr<InputStream>();
    }
    unsigned char* bytes = new (std::nothrow) unsigned char[entry.uncompressedSize];
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
