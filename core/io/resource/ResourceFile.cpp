#include "io/resource/ResourceFile.h"

#include "io/resource/ResBlockInputStream.h"
#include "io/resource/impl/FileSystemImpl.h"
#include "util/Logger.h"

namespace IO {
namespace Resource {

namespace {

// The 8-byte extra field of a split resource's first entry.
struct ExtraField {
    unsigned int totalSize;
    unsigned int blockSize;
};

unsigned int readLittleEndian32(const unsigned char* bytes) {
    return bytes[0] | (bytes[1] << 8) | (bytes[2] << 16) | (static_cast<unsigned int>(bytes[3]) << 24);
}

}  // namespace

boost::shared_ptr<FileSystem> ResourceFile::createFileSystem(boost::shared_ptr<InputStream> package) {
    boost::shared_ptr<Zip::ZipFile> zip(new Zip::ZipFile());
    if (!zip->init(package, nullptr)) {
        return boost::shared_ptr<FileSystem>();
    }
    return boost::shared_ptr<FileSystem>(new FileSystemImpl(zip->getIndex()));
}

ResourceFile::ResourceFile(boost::shared_ptr<InputStream> package) : stream(package) {}

boost::shared_ptr<InputStream> ResourceFile::openInputStream(const std::string& resourceName,
                                                             boost::shared_ptr<FileSystem> packageIndex) {
    KD_ASSERT(!file);
    name = resourceName;
    boost::shared_ptr<FileSystem> fileSystem = packageIndex ? packageIndex : createFileSystem(stream);
    if (!fileSystem) {
        return boost::shared_ptr<InputStream>();
    }
    file.reset(new Zip::ZipFile());
    if (!file->initWithIndex(stream, static_cast<const FileSystemImpl&>(*fileSystem).getEntries())) {
        KD_ASSERT(false);
        return boost::shared_ptr<InputStream>();
    }
    const Zip::ZipEntry* entry = file->findEntry(name);
    if (!entry) {
        Logger::log(Logger::Info, "File %s not found in resource", name.c_str());
        return boost::shared_ptr<InputStream>();
    }
    if (entry->extra.empty()) {
        return file->getInputStream(*entry, true);
    }
    KD_ASSERT(entry->extra.size() == sizeof(ExtraField));
    if (entry->extra.size() != sizeof(ExtraField)) {
        return boost::shared_ptr<InputStream>();
    }
    ExtraField extra = {readLittleEndian32(&entry->extra[0]), readLittleEndian32(&entry->extra[4])};
    if (extra.totalSize <= extra.blockSize) {
        return file->getInputStream(*entry, true);
    }
    // A block size of 0 cannot describe a split resource.
    KD_ASSERT(extra.blockSize > 0);
    if (extra.blockSize == 0) {
        return boost::shared_ptr<InputStream>();
    }
    return boost::shared_ptr<InputStream>(new ResBlockInputStream(
        BlockInputStream::BlockOpener::make<ResourceFile, &ResourceFile::openEntryStream>(this),
        extra.totalSize, extra.blockSize, shared_from_this()));
}

boost::shared_ptr<InputStream> ResourceFile::openEntryStream(unsigned int index) {
    KD_ASSERT(file);
    if (!file) {
        return boost::shared_ptr<InputStream>();
    }
    std::string entryName = name;
    if (index > 0) {
        // At least three digits: name.part001, name.part002 ...
        char suffix[32];
        kdSprintf_s(suffix, sizeof(suffix), ".part%03u", index);
        entryName += suffix;
    }
    const Zip::ZipEntry* entry = file->findEntry(entryName);
    KD_ASSERT(entry);
    if (!entry) {
        return boost::shared_ptr<InputStream>();
    }
    return file->getInputStream(*entry, true);
}

}  // namespace Resource
}  // namespace IO
