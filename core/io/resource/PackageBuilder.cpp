#include "io/resource/PackageBuilder.h"

#include <algorithm>
#include <climits>

#include "io/FileManager.h"
#include "util/Logger.h"

namespace IO {
namespace Resource {

namespace {

const size_t kMaxEntryName = 255;

void appendLittleEndian32(std::vector<unsigned char>& bytes, unsigned int value) {
    for (int i = 0; i < 4; ++i) {
        bytes.push_back(static_cast<unsigned char>(value >> (8 * i)));
    }
}

std::string partName(const std::string& name, unsigned int index) {
    if (index == 0) {
        return name;
    }
    char suffix[32];
    kdSprintf_s(suffix, sizeof(suffix), ".part%03u", index);
    return name + suffix;
}

bool endsWith(const std::string& text, const std::string& ending) {
    return ending.size() <= text.size() &&
           text.compare(text.size() - ending.size(), ending.size(), ending) == 0;
}

}  // namespace

PackageBuilder::PackageBuilder(boost::shared_ptr<OutputStream> out, unsigned int blockSize)
    : zip(new Zip::ZipOutputStream(out)), blockSize(blockSize) {}

PackageBuilder::~PackageBuilder() {
    finish();
}

void PackageBuilder::finish() {
    zip.reset();
}

bool PackageBuilder::claimNames(const std::string& name, unsigned int blockCount) {
    // A repeated entry name would leave the reader with only the last one; a split resource
    // whose part collides with another resource would read that resource's bytes.
    std::vector<std::string> names;
    for (unsigned int i = 0; i < blockCount; ++i) {
        names.push_back(partName(name, i));
        // Readers cannot locate a compressed entry by a longer name.
        if (names.back().size() > kMaxEntryName) {
            Logger::log(Logger::Error, "PackageBuilder: entry name %s is too long", names.back().c_str());
            return false;
        }
        if (entryNames.count(names.back())) {
            Logger::log(Logger::Error, "PackageBuilder: entry %s is already in the package",
                        names.back().c_str());
            return false;
        }
    }
    entryNames.insert(names.begin(), names.end());
    return true;
}

bool PackageBuilder::addResource(const std::string& name, const void* data, size_t size, bool compressed) {
    KD_ASSERT(zip);
    if (!zip || name.empty() || size > UINT_MAX) {
        Logger::log(Logger::Error, "PackageBuilder: cannot add resource '%s'", name.c_str());
        return false;
    }
    const unsigned char* bytes = static_cast<const unsigned char*>(data);
    unsigned int total = static_cast<unsigned int>(size);
    bool split = blockSize > 0 && total > blockSize;
    unsigned int blockCount = split ? (total - 1) / blockSize + 1 : 1;
    if (!claimNames(name, blockCount)) {
        return false;
    }
    if (!split) {
        writeEntry(name, bytes, total, compressed, std::vector<unsigned char>());
        return true;
    }
    std::vector<unsigned char> extra;
    appendLittleEndian32(extra, total);
    appendLittleEndian32(extra, blockSize);
    for (unsigned int i = 0; i < blockCount; ++i) {
        unsigned int offset = i * blockSize;
        unsigned int length = total - offset < blockSize ? total - offset : blockSize;
        writeEntry(partName(name, i), bytes + offset, length, compressed,
                   i == 0 ? extra : std::vector<unsigned char>());
    }
    return true;
}

void PackageBuilder::writeEntry(const std::string& name, const unsigned char* data, unsigned int size,
                                bool compressed, const std::vector<unsigned char>& extra) {
    zip->openEntry(name.c_str(), compressed, extra);
    // Writes are int-sized.
    const unsigned int chunk = 1u << 30;
    for (unsigned int done = 0; done < size;) {
        unsigned int length = size - done < chunk ? size - done : chunk;
        zip->write(data + done, static_cast<int>(length));
        done += length;
    }
    zip->closeEntry();
}

bool PackageBuilder::addResource(const std::string& name, InputStream& data, bool compressed) {
    long long left = data.available();
    if (left < 0 || left > INT_MAX) {
        Logger::log(Logger::Error, "PackageBuilder: cannot read resource '%s'", name.c_str());
        return false;
    }
    std::vector<unsigned char> bytes(static_cast<size_t>(left));
    if (left > 0 && data.read(bytes.data(), static_cast<int>(left)) != left) {
        Logger::log(Logger::Error, "PackageBuilder: cannot read resource '%s'", name.c_str());
        return false;
    }
    return addResource(name, bytes.data(), bytes.size(), compressed);
}

int PackageBuilder::addDirectory(const char* dir, bool compressed,
                                 const std::vector<std::string>& storedSuffixes) {
    std::string folder(dir);
    while (folder.size() > 1 && folder.back() == '/') {
        folder.pop_back();
    }
    std::vector<std::string> paths;
    FileManager::scanDirectory(folder.c_str(), paths, nullptr, true);
    // The same folder always gives the same package.
    std::sort(paths.begin(), paths.end());
    const size_t prefixLength = folder.size() + 1;
    int added = 0;
    for (const std::string& path : paths) {
        bool stored = false;
        for (const std::string& suffix : storedSuffixes) {
            stored = stored || endsWith(path, suffix);
        }
        boost::shared_ptr<InputStream> stream = FileManager::doOpenInput(path.c_str());
        if (!stream || !addResource(path.substr(prefixLength), *stream, compressed && !stored)) {
            Logger::log(Logger::Error, "PackageBuilder: could not add %s", path.c_str());
            return -1;
        }
        ++added;
    }
    return added;
}

}  // namespace Resource
}  // namespace IO
