#pragma once

namespace IO {
namespace Resource {

// Opaque handle of a package's index, made by ResourceFile::createFileSystem. Read-only once
// made, so any thread may use it.
class FileSystem {
public:
    virtual ~FileSystem() {}
};

}  // namespace Resource
}  // namespace IO
