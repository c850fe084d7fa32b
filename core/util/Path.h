#pragma once

#include <string>

// Parts of a "/"-separated file path. Any thread.
class Path {
public:
    // The text after the last "/", or the whole path without one.
    static std::string getFilename(const std::string& path);
    // The text after the last "." of the file name; empty when the name has none.
    static std::string getExtension(const std::string& path);
    // The file name up to its last "."; the whole name when it has none.
    static std::string getFilenameWithoutExtension(const std::string& path);
};
