#include "PathMapper.h"

#include <pal/Simulation.h>

#include <mutex>

namespace {

// Guards root: file calls on worker threads read it while the boot thread
// may set it (tests give every case a fresh root).
std::mutex rootMutex;
// The host folder without trailing slashes (except the host root "/"); empty
// while no root is set.
std::string root;

std::string currentRoot() {
    std::lock_guard<std::mutex> lock(rootMutex);
    return root;
}

std::string withoutTrailingSlashes(std::string folder) {
    while (folder.size() > 1 && folder.back() == '/') {
        folder.pop_back();
    }
    return folder;
}

}  // namespace

namespace pal {

void setFileRoot(const std::string& hostFolder) {
    std::lock_guard<std::mutex> lock(rootMutex);
    root = withoutTrailingSlashes(hostFolder);
}

const std::string& fileRoot() {
    return root;
}

std::string hostPath(const char* platformPath) {
    detail::MappedPath mapped = detail::mapPath(platformPath);
    return mapped.error == 0 ? mapped.host : std::string();
}

}  // namespace pal

namespace pal::detail {

MappedPath mapPath(const char* platformPath) {
    MappedPath mapped;
    if (platformPath == nullptr) {
        mapped.error = KD_EINVAL;
        return mapped;
    }
    if (*platformPath == '\0') {
        mapped.error = KD_ENOENT;
        return mapped;
    }
    std::string host = currentRoot();
    if (host.empty()) {
        mapped.error = KD_EACCES;
        return mapped;
    }
    if (host == "/") {
        host.clear();
    }
    mapped.rootLength = host.size();
    bool anyComponent = false;
    const std::string path(platformPath);
    std::string::size_type start = 0;
    while (start <= path.size()) {
        std::string::size_type end = path.find('/', start);
        if (end == std::string::npos) {
            end = path.size();
        }
        const std::string component = path.substr(start, end - start);
        start = end + 1;
        if (component.empty() || component == ".") {
            continue;
        }
        if (component == "..") {
            mapped.error = KD_EACCES;
            return mapped;
        }
        host += '/';
        host += component;
        anyComponent = true;
    }
    // A trailing slash keeps its POSIX meaning ("must be a directory").
    if (anyComponent && path.back() == '/') {
        host += '/';
    }
    if (!anyComponent) {
        mapped.isRoot = true;
        if (host.empty()) {
            host = "/";
        }
    }
    mapped.host = host;
    return mapped;
}

}  // namespace pal::detail
