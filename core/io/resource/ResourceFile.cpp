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
    int foreign = 0;
    for (const Zip::ZipEntryMap::value_type& item : zip->getEntries()) {
        const size_t size = item.second.extra.size();
        foreign += size != 0 && size != sizeof(ExtraField);
    }
    if (foreign > 0) {
        // Ordinary zip tools add fields of their own (timestamps, owners) to every entry.
        Logger::log(Logger::Warning,
                    "Resource package: %d entries carry extra fields of other tools; read as single entries",
                    foreign);
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
    // Only our own 8-byte field splits a resource; any other is another tool's and the entry is
    // the whole resource.
    if (entry->extra.size() != sizeof(ExtraField)) {
        return file->getInputStream(*entry, true);
    }
    ExtraField extra = {readLittleEndian32(&entry->extra[0]), readLittleEndian32(&entry->extra[4])};
    if (extra.totalSize <= extra.blockSize) {
        return file->getInputStream(*entry, true);
    }
    if (!partsHold(*entry, extra.totalSize, extra.blockSize)) {
        Logger::log(Logger::Error,
                    "ResourceFile: %s claims %u bytes in blocks of %u that the package does not hold",
                    name.c_str(), extra.totalSize, extra.blockSize);
        return boost::shared_ptr<InputStream>();
    }
    return boost::shared_ptr<InputStream>(new ResBlockInputStream(
        BlockInputStream::BlockOpener::make<ResourceFile, &ResourceFile::openEntryStream>(this),
        extra.totalSize, extra.blockSize, shared_from_this()));
}

bool ResourceFile::partsHold(const Zip::ZipEntry& first, unsigned int totalSize,
                             unsigned int blockSize) const {
    // A block size of 0 cannot describe a split resource.
    KD_ASSERT(blockSize > 0);
    if (blockSize == 0) {
        return false;
    }
    // Every part is looked up before anything is sized from the claim; the walk ends at the first
    // part that is not there, so a claim of millions of blocks costs no more than the package has.
    const unsigned int count = (totalSize - 1) / blockSize + 1;
    for (unsigned int index = 0; index < count; ++index) {
        const Zip::ZipEntry* entry = index == 0 ? &first : file->findEntry(partName(index));
        KD_ASSERT(entry);
        const unsigned int expected = index + 1 < count ? blockSize : totalSize - index * blockSize;
        if (!entry || entry->uncompressedSize != expected) {
            return false;
        }
    }
    return true;
}

std::string ResourceFile::partName(unsigned int index) const {
    if (index == 0) {
        return name;
    }
    // At least three digits: name.part001, name.part002 ...
    char suffix[32];
    kdSprintf_s(suffix, sizeof(suffix), ".part%03u", index);
    return name + suffix;
}

boost::shared_ptr<InputStream> ResourceFile::openEntryStream(unsigned int index) {
    KD_ASSERT(file);
    if (!file) {
        return boost::shared_ptr<InputStream>();
    }
    const Zip::ZipEntry* entry = file->findEntry(partName(index));
    KD_ASSERT(entry);
    if (!entry) {
        return boost::shared_ptr<InputStream>();
    }
    return file->getInputStream(*entry, true);
}

}  // namespace Resource
}  // namespace IO
