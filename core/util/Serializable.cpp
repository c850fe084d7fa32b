#include "util/Serializable.h"

#include <KD/kdext.h>

#include <string>

#include "io/ByteArrayOutputStream.h"
#include "io/Exception.h"
#include "io/FileManager.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "util/Logger.h"

namespace Util {

namespace {

const char kDataDir[] = "/data/";
const char kTmpDir[] = "/tmp/";

// Written through the platform's own calls rather than a stream, because only these report a
// failed close, which is where a full disk shows up for buffered writes.
bool writeWholeFile(const std::string& path, const std::vector<unsigned char>& content) {
    // The name may carry folders of its own.
    kdMkdirAllZVR(path.substr(0, path.rfind('/') + 1).c_str());
    KDFile* file = kdFopen(path.c_str(), "wb");
    if (!file) {
        return false;
    }
    const bool written = kdFwrite(content.data(), 1, content.size(), file) == content.size();
    const bool closed = kdFclose(file) == 0;
    return written && closed;
}

}  // namespace

Serializable::Serializable(const char* name, const char* magic, int formatVersion, bool compressed)
    : name(name), magic(magic), formatVersion(formatVersion), compressed(compressed) {}

Serializable::~Serializable() {}

bool Serializable::load() {
    reset();
    boost::shared_ptr<IO::InputStream> stream = openInput(kDataDir, name);
    if (!stream) {
        stream = openInput(kTmpDir, name);
    }
    if (!stream) {
        Logger::log(Logger::Debug, "No %s found", name);
        return false;
    }
    try {
        stream->enableExceptions();
        if (read(stream)) {
            return true;
        }
        Logger::log(Logger::Debug, "Invalid %s", name);
    } catch (const IO::Exception&) {
        Logger::log(Logger::Info, "Bad state");
    }
    // Whatever a failed read had filled in must not survive next to the defaults.
    reset();
    return false;
}

void Serializable::save() const {
    const std::string temporary = std::string(kDataDir) + name + ".tmp";
    std::vector<unsigned char> content;
    if (!serialize(content) || !writeWholeFile(temporary, content)) {
        kdRemove(temporary.c_str());
        Logger::log(Logger::Debug, "Failed to write to %s", temporary.c_str());
        return;
    }
    const std::string finalPath = std::string(kDataDir) + name;
    Logger::log(Logger::Info, "Renaming %s to %s", temporary.c_str(), finalPath.c_str());
    // A rename over the old file replaces it in one step; removing it first would open a
    // moment in which neither file exists.
    if (kdRename(temporary.c_str(), finalPath.c_str()) != 0) {
        kdRemove(temporary.c_str());
        Logger::log(Logger::Debug, "Failed to write to %s", finalPath.c_str());
    }
}

bool Serializable::read(boost::shared_ptr<IO::InputStream> stream) {
    char expected[kMagicSize];
    magicBytes(expected);
    char found[kMagicSize];
    if (stream->read(found, kMagicSize) != kMagicSize || kdMemcmp(found, expected, kMagicSize) != 0) {
        return false;
    }
    readFormatVersion = stream->readInt();
    if (readFormatVersion > formatVersion) {
        return false;
    }
    return readFormatVersion == formatVersion || supportPreviousFormatVersions;
}

void Serializable::write(boost::shared_ptr<IO::OutputStream> stream) const {
    char bytes[kMagicSize];
    magicBytes(bytes);
    stream->write(bytes, kMagicSize);
    stream->writeInt(formatVersion);
}

boost::shared_ptr<IO::InputStream> Serializable::openInput(const char* dir, const char* name) const {
    boost::shared_ptr<IO::InputStream> stream = IO::FileManager::openInput((std::string(dir) + name).c_str());
    if (stream && compressed) {
        stream.reset(new IO::Zip::GzipInputStream(stream.get()));
    }
    return stream;
}

bool Serializable::serialize(std::vector<unsigned char>& content) const {
    boost::shared_ptr<IO::ByteArrayOutputStream> plain(new IO::ByteArrayOutputStream());
    if (!compressed) {
        write(plain);
        content = plain->getData();
        return true;
    }
    {
        // The gzip stream compresses into plain when it is released.
        boost::shared_ptr<IO::OutputStream> gzip(new IO::Zip::GzipOutputStream(plain.get()));
        write(gzip);
    }
    content = plain->getData();
    // Even an empty body makes a gzip header and trailer; nothing at all means deflate failed.
    return !content.empty();
}

void Serializable::magicBytes(char (&bytes)[kMagicSize]) const {
    // A shorter magic is padded with zeros rather than read past its end.
    const KDsize length = magic ? kdStrnlen(magic, kMagicSize) : 0;
    kdMemset(bytes, 0, kMagicSize);
    if (length > 0) {
        kdMemcpy(bytes, magic, length);
    }
}

}  // namespace Util
