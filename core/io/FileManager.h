#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "io/OutputStream.h"

namespace IO {

// Turns the application's file paths into open streams. Resources ("/res/...") come from the
// package "/res/<package name>.pak", where a file "/data/<name>" overrides the resource <name>.
// The package is opened by initResourceFileSystem and released by the matching last
// shutdownResourceFileSystem, both on the main thread; the other calls may be made from any
// thread once the package state is settled.
class FileManager {
public:
    // True for names starting with "/res" (the name must start with '/').
    static bool isResourceFile(const char* aFileName);

    // Empty when the file cannot be opened. Not for resource paths.
    static boost::shared_ptr<InputStream> openInput(const char* aFileName);
    static boost::shared_ptr<OutputStream> openOutput(const char* aFileName);
    // Opens a file of any path; empty when it cannot be opened.
    static boost::shared_ptr<InputStream> doOpenInput(const char* aFileName);

    // The override "/data/<name>" if it exists, else the package's resource; empty when
    // neither exists or the package has not been initialised.
    static boost::shared_ptr<InputStream> openInputRes(const char* aFileName);

    // Counted: the first call opens and indexes the package, later ones only count.
    static void initResourceFileSystem();
    // The call matching the first initResourceFileSystem releases the package. Streams handed
    // out keep what they read alive.
    static void shutdownResourceFileSystem();

    // Appends the full paths of the files in dir that end with suffix (all files when suffix is
    // null or empty), descending into folders when recursive. Output is appended, never
    // cleared; an unreadable dir is logged and leaves it untouched. A symbolic link to a folder
    // is not followed (it may lead back up the tree); a link to a file is listed like the file.
    static void scanDirectory(const char* dir, std::vector<std::string>& out, const char* suffix,
                              bool recursive);
};

}  // namespace IO
