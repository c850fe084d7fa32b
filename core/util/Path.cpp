#include "util/Path.h"

std::string Path::getFilename(const std::string& path) {
    const std::string::size_type slash = path.rfind('/');
    return slash == std::string::npos ? path : path.substr(slash + 1);
}

std::string Path::getExtension(const std::string& path) {
    const std::string name = getFilename(path);
    const std::string::size_type dot = name.rfind('.');
    return dot == std::string::npos ? std::string() : name.substr(dot + 1);
}

std::string Path::getFilenameWithoutExtension(const std::string& path) {
    const std::string name = getFilename(path);
    const std::string::size_type dot = name.rfind('.');
    return dot == std::string::npos ? name : name.substr(0, dot);
}
