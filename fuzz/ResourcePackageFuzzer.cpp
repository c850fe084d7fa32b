// Resource packages (zip archives, possibly with split resources) as the application opens them:
// the package "/res/<package name>.pak" indexed by the resource file system, then every resource
// it names opened through FileManager::openInputRes and read to its end.
#include <KD/kdext.h>
#include <pal/Simulation.h>

#include <boost/shared_ptr.hpp>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "io/ByteArrayInputStream.h"
#include "io/Exception.h"
#include "io/FileManager.h"
#include "io/zip/ZipFile.h"

namespace {

// Bounds the work per input: a damaged entry may claim gigabytes.
const long long kReadBudget = 1 << 20;
const int kMaxResources = 64;

std::vector<std::string> entryNames(const uint8_t* data, size_t size) {
    std::vector<std::string> names;
    boost::shared_ptr<IO::InputStream> archive(new IO::ByteArrayInputStream(data, static_cast<int>(size)));
    boost::shared_ptr<IO::Zip::ZipFile> zip(new IO::Zip::ZipFile());
    if (!zip->init(archive, nullptr)) {
        return names;
    }
    for (const auto& entry : zip->getEntries()) {
        names.push_back(entry.first);
    }
    return names;
}

long long readResource(const std::string& name, long long budget, bool exceptions) {
    boost::shared_ptr<IO::InputStream> stream = IO::FileManager::openInputRes(name.c_str());
    if (!stream) {
        return 0;
    }
    if (exceptions) {
        stream->enableExceptions();
    }
    long long total = 0;
    char buffer[4096];
    try {
        while (total < budget && stream->available() > 0) {
            const long long left = stream->available();
            const int length = left < static_cast<long long>(sizeof(buffer))
                                   ? static_cast<int>(left)
                                   : static_cast<int>(sizeof(buffer));
            const int got = stream->read(buffer, length);
            if (got <= 0) {
                break;
            }
            total += got;
        }
        stream->seek(-1, KD_SEEK_END);
        stream->read(buffer, 1);
    } catch (const IO::Exception&) {
    }
    return total;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool named = [] {
        fuzz::bootPlatform();
        pal::setDeviceString(KD_STRING_PACKAGE_NAME_ZVR, "fuzz");
        return true;
    }();
    (void)named;
    fuzz::check(fuzz::writePlatformFile("/res/fuzz.pak", data, size), "the package is written");
    IO::FileManager::initResourceFileSystem();
    long long budget = kReadBudget;
    int opened = 0;
    for (const std::string& name : entryNames(data, size)) {
        if (budget <= 0 || ++opened > kMaxResources) {
            break;
        }
        budget -= readResource(name, budget, (opened & 1) != 0);
    }
    IO::FileManager::shutdownResourceFileSystem();
    return 0;
}
