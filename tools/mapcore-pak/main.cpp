// mapcore-pak: packs a folder into a resource package that IO::FileManager reads as
// "/res/<package name>.pak".
//
//   mapcore-pak [--store] [--store-suffix SUFFIX]... [--block-size BYTES] FOLDER PACKAGE
//
// Every file below FOLDER becomes the resource named by its path below FOLDER. Files are
// deflated unless --store is given or their name ends in a --store-suffix (already compressed
// formats such as .png gain nothing from deflate and read faster stored). Files larger than
// --block-size bytes (default 0: never) are split into parts read back as one stream.
#include <KD/kd.h>
#include <pal/Simulation.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "io/FileOutputStream.h"
#include "io/resource/PackageBuilder.h"

namespace {

struct Options {
    bool compressed = true;
    std::vector<std::string> storedSuffixes;
    unsigned long blockSize = 0;
    std::string folder;
    std::string package;
};

int usage() {
    std::fprintf(
        stderr,
        "usage: mapcore-pak [--store] [--store-suffix SUFFIX]... [--block-size BYTES] FOLDER PACKAGE\n");
    return 2;
}

bool parse(int argc, char** argv, Options& options) {
    std::vector<std::string> positional;
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "--store") {
            options.compressed = false;
        } else if (arg == "--store-suffix" && i + 1 < argc) {
            options.storedSuffixes.push_back(argv[++i]);
        } else if (arg == "--block-size" && i + 1 < argc) {
            char* end = nullptr;
            options.blockSize = std::strtoul(argv[++i], &end, 10);
            if (*end != '\0' || options.blockSize > 0xFFFFFFFFul) {
                return false;
            }
        } else if (!arg.empty() && arg[0] != '-') {
            positional.push_back(arg);
        } else {
            return false;
        }
    }
    if (positional.size() != 2) {
        return false;
    }
    options.folder = positional[0];
    options.package = positional[1];
    return true;
}

// The platform layer's tree is rooted at the host's "/", so a host path is a platform path once
// it is absolute and free of "..".
std::string platformPath(const std::string& hostPath) {
    return std::filesystem::weakly_canonical(std::filesystem::absolute(hostPath)).string();
}

// Returns the number of resources packed, or -1.
int pack(const std::string& folder, const std::string& package, const Options& options) {
    boost::shared_ptr<IO::FileOutputStream> out(new IO::FileOutputStream());
    if (!out->init(package.c_str())) {
        std::fprintf(stderr, "mapcore-pak: cannot write %s\n", options.package.c_str());
        return -1;
    }
    IO::Resource::PackageBuilder builder(out, static_cast<unsigned int>(options.blockSize));
    int added = builder.addDirectory(folder.c_str(), options.compressed, options.storedSuffixes);
    if (added < 0) {
        std::fprintf(stderr, "mapcore-pak: packing %s failed\n", options.folder.c_str());
    } else if (added == 0) {
        // A zip archive without entries cannot be opened again.
        std::fprintf(stderr, "mapcore-pak: %s holds no files\n", options.folder.c_str());
        return -1;
    }
    return added;
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    if (!parse(argc, argv, options)) {
        return usage();
    }
    std::error_code error;
    if (!std::filesystem::is_directory(options.folder, error)) {
        std::fprintf(stderr, "mapcore-pak: %s is not a folder\n", options.folder.c_str());
        return 1;
    }
    pal::setFileRoot("/");
    std::string folder = platformPath(options.folder);
    std::string package = platformPath(options.package);

    int added = pack(folder, package, options);
    if (added < 0) {
        std::filesystem::remove(options.package, error);
        return 1;
    }
    std::printf("mapcore-pak: %d resources from %s into %s\n", added, options.folder.c_str(),
                options.package.c_str());
    return 0;
}
