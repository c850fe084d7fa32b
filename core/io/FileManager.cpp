#include "io/FileManager.h"

#include <KD/kdext.h>

#include "io/FileInputStream.h"
#include "io/FileOutputStream.h"
#include "io/resource/ResourceFile.h"
#include "util/Logger.h"

namespace IO {

namespace {

const int kPathSize = 256;

boost::shared_ptr<Resource::FileSystem> packageFileSystem;
int initFsCount = 0;
char packagePath[kPathSize] = "";

}  // namespace

bool FileManager::isResourceFile(const char* aFileName) {
    KD_ASSERT(aFileName);
    if (!aFileName) {
        return false;
    }
    KD_ASSERT(kdStrlen(aFileName) >= 4);
    KD_ASSERT(aFileName[0] == '/');
    // Compares the four characters only, so "/resources/x" counts too; stops at a shorter
    // name's terminator.
    return kdStrncmp(aFileName, "/res", 4) == 0;
}

boost::shared_ptr<InputStream> FileManager::openInput(const char* aFileName) {
    KD_ASSERT(!isResourceFile(aFileName));
    return doOpenInput(aFileName);
}

boost::shared_ptr<InputStream> FileManager::doOpenInput(const char* aFileName) {
    boost::shared_ptr<FileInputStream> stream(new FileInputStream());
    if (!stream->init(aFileName)) {
        return boost::shared_ptr<InputStream>();
    }
    return stream;
}

boost::shared_ptr<OutputStream> FileManager::openOutput(const char* aFileName) {
    KD_ASSERT(!isResourceFile(aFileName));
    boost::shared_ptr<FileOutputStream> stream(new FileOutputStream());
    if (!stream->init(aFileName)) {
        return boost::shared_ptr<OutputStream>();
    }
    return stream;
}

boost::shared_ptr<InputStream> FileManager::openInputRes(const char* aFileName) {
    if (initFsCount == 0) {
        Logger::log(Logger::Error, "FileManager::openInputRes()[resource file system not initialised] %s",
                    aFileName);
        return boost::shared_ptr<InputStream>();
    }
    char overridePath[kPathSize];
    // A cut path could name another file: a name too long to override is not overridden.
    int length = kdSprintf_s(overridePath, sizeof(overridePath), "/data/%s", aFileName);
    if (length >= 0 && length < kPathSize) {
        boost::shared_ptr<InputStream> stream = doOpenInput(overridePath);
        if (stream) {
            return stream;
        }
    }
    boost::shared_ptr<InputStream> package =
        packageFileSystem ? doOpenInput(packagePath) : boost::shared_ptr<InputStream>();
    if (!package) {
        Logger::log(Logger::Info, "File %s not found in resource", aFileName);
        return boost::shared_ptr<InputStream>();
    }
    boost::shared_ptr<Resource::ResourceFile> resource(new Resource::ResourceFile(package));
    return resource->openInputStream(aFileName, packageFileSystem);
}

void FileManager::initResourceFileSystem() {
    KD_ASSERT(kdThreadIsMainZVR());
    KD_ASSERT(initFsCount >= 0);
    if (initFsCount == 0) {
        const char* packageName = kdGetStringZVR(KD_STRING_PACKAGE_NAME_ZVR);
        kdSprintf_s(packagePath, sizeof(packagePath), "/res/%s.pak", packageName ? packageName : "");
        boost::shared_ptr<InputStream> package = doOpenInput(packagePath);
        if (package) {
            packageFileSystem = Resource::ResourceFile::createFileSystem(package);
        } else {
            Logger::log(Logger::Error, "FileManager::initResourceFileSystem()[could not open %s]",
                        packagePath);
        }
    }
    ++initFsCount;
}

void FileManager::shutdownResourceFileSystem() {
    KD_ASSERT(kdThreadIsMainZVR());
    KD_ASSERT(initFsCount > 0);
    if (initFsCount <= 0) {
        return;
    }
    --initFsCount;
    if (initFsCount == 0) {
        packageFileSystem.reset();
    }
}

void FileManager::scanDirectory(const char* dir, std::vector<std::string>& out, const char* suffix,
                                bool recursive) {
    KDDir* handle = kdOpenDir(dir);
    if (!handle) {
        Logger::log(Logger::Error, "FileManager::scanDirectory()[could not open dir]");
        return;
    }
    std::string ending = suffix ? suffix : "";
    for (KDDirent* entry = kdReadDir(handle); entry; entry = kdReadDir(handle)) {
        std::string name = entry->d_name;
        std::string path = std::string(dir) + "/" + name;
        // A link to a folder is not followed: it may lead back up the tree and never end. A link
        // to a file is listed as the file.
        KDStat info;
        if (kdLstatZVR(path.c_str(), &info) != 0) {
            continue;
        }
        const bool link = KD_ISLNK_ZVR(info.st_mode);
        if (link && (kdStat(path.c_str(), &info) != 0 || KD_ISDIR(info.st_mode))) {
            continue;
        }
        if (!KD_ISDIR(info.st_mode)) {
            if (ending.empty() || (ending.size() <= path.size() &&
                                   path.compare(path.size() - ending.size(), ending.size(), ending) == 0)) {
                out.push_back(path);
            }
        } else if (recursive && name != "." && name != "..") {
            scanDirectory(path.c_str(), out, suffix, recursive);
        }
    }
    kdCloseDir(handle);
}

}  // namespace IO
