// Resource packages: builds a small package with the package builder into the
// platform's "/res" folder (one resource split into parts, one overridden by a
// file in "/data"), opens it through the file manager and shows what reads
// back, including a gzip round trip of one resource.

#include <KD/kdext.h>

#include <algorithm>
#include <boost/make_shared.hpp>
#include <string>
#include <vector>

#include "DemoScene.h"
#include "io/ByteArrayInputStream.h"
#include "io/ByteArrayOutputStream.h"
#include "io/FileManager.h"
#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"
#include "io/zip/GzipInputStream.h"
#include "io/zip/GzipOutputStream.h"

namespace {

const unsigned int kBlockSize = 1000;
const int kAtlasSize = 2500;

std::vector<unsigned char> atlasBytes() {
    std::vector<unsigned char> bytes(kAtlasSize);
    for (int i = 0; i < kAtlasSize; ++i) {
        bytes[i] = static_cast<unsigned char>(i % 251);
    }
    return bytes;
}

std::string readText(IO::InputStream& stream) {
    std::string text(static_cast<size_t>(stream.available()), '\0');
    if (!text.empty()) {
        stream.read(&text[0], static_cast<int>(text.size()));
    }
    return text;
}

// Main thread only.
class ResourcePackageScene : public DemoScene {
public:
    void run(Done done) override {
        std::string package = std::string("/res/") + kdGetStringZVR(KD_STRING_PACKAGE_NAME_ZVR) + ".pak";
        if (build(package)) {
            writeOverride();
            IO::FileManager::initResourceFileSystem();
            show();
            IO::FileManager::shutdownResourceFileSystem();
        }
        done();
    }

private:
    static bool build(const std::string& package) {
        if (!pack(package)) {
            demo::say("cannot write %s", package.c_str());
            return false;
        }
        KDStat info;
        kdStat(package.c_str(), &info);
        demo::say(
            "built %s (%lld bytes): readme.txt and greeting.txt deflated, atlas.bin (%d bytes) stored "
            "in blocks of %u as atlas.bin, atlas.bin.part001, atlas.bin.part002",
            package.c_str(), static_cast<long long>(info.st_size), kAtlasSize, kBlockSize);
        return true;
    }

    // The package is complete once the builder has finished and the file is closed.
    static bool pack(const std::string& package) {
        boost::shared_ptr<IO::FileOutputStream> out = boost::make_shared<IO::FileOutputStream>();
        if (!out->init(package.c_str())) {
            return false;
        }
        IO::Resource::PackageBuilder builder(out, kBlockSize);
        const std::string readme = "Resources ship in one zip package; big ones are split into parts.";
        const std::string greeting = "Hello from the package";
        std::vector<unsigned char> atlas = atlasBytes();
        return builder.addResource("readme.txt", readme.data(), readme.size(), true) &&
               builder.addResource("greeting.txt", greeting.data(), greeting.size(), true) &&
               builder.addResource("atlas.bin", atlas.data(), atlas.size(), false);
    }

    static void writeOverride() {
        IO::FileOutputStream out;
        const std::string text = "Hello from /data, which overrides the package";
        if (out.init("/data/greeting.txt")) {
            out.write(text.data(), static_cast<int>(text.size()));
            demo::say("wrote the override /data/greeting.txt");
        }
    }

    static void show() {
        boost::shared_ptr<IO::InputStream> readme = IO::FileManager::openInputRes("readme.txt");
        demo::say("readme.txt: \"%s\"", readme ? readText(*readme).c_str() : "(missing)");
        boost::shared_ptr<IO::InputStream> greeting = IO::FileManager::openInputRes("greeting.txt");
        demo::say("greeting.txt: \"%s\"", greeting ? readText(*greeting).c_str() : "(missing)");

        boost::shared_ptr<IO::InputStream> atlas = IO::FileManager::openInputRes("atlas.bin");
        if (atlas) {
            atlas->seek(2200, KD_SEEK_SET);
            unsigned char bytes[4];
            atlas->read(bytes, sizeof(bytes));
            std::vector<unsigned char> expected = atlasBytes();
            bool same = std::equal(bytes, bytes + 4, expected.begin() + 2200);
            demo::say("atlas.bin: %lld bytes; after seeking to 2200 (in .part002) read %u %u %u %u: %s",
                      static_cast<long long>(atlas->available() + atlas->tell()), bytes[0], bytes[1],
                      bytes[2], bytes[3], same ? "as packed" : "WRONG");
            atlas->seek(0, KD_SEEK_SET);
            std::vector<unsigned char> all(kAtlasSize);
            int count = atlas->read(all.data(), kAtlasSize);
            demo::say("atlas.bin: read %d bytes across all parts: %s", count,
                      all == expected ? "as packed" : "WRONG");
            gzipRoundTrip(all);
        }
        demo::say("missing.png gives %s",
                  IO::FileManager::openInputRes("missing.png") ? "a stream" : "no stream");
    }

    static void gzipRoundTrip(const std::vector<unsigned char>& data) {
        IO::ByteArrayOutputStream compressed;
        {
            IO::Zip::GzipOutputStream gzip(&compressed);
            gzip.write(data.data(), static_cast<int>(data.size()));
        }
        IO::ByteArrayInputStream in(compressed.getData().data(),
                                    static_cast<int>(compressed.getData().size()));
        IO::Zip::GzipInputStream unzipped(&in);
        std::vector<unsigned char> back(static_cast<size_t>(unzipped.available()));
        if (!back.empty()) {
            unzipped.read(back.data(), static_cast<int>(back.size()));
        }
        demo::say("gzip: %zu bytes compressed to %zu and back: %s", data.size(), compressed.getData().size(),
                  back == data ? "identical" : "DIFFERENT");
    }
};

DemoSceneRegistration<ResourcePackageScene> registration("Resource packages", 40);

}  // namespace
