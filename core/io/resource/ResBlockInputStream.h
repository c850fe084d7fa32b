#pragma once

#include <boost/shared_ptr.hpp>

#include "io/resource/BlockInputStream.h"
#include "io/resource/ResourceFile.h"

namespace IO {
namespace Resource {

// A split resource read through the resource file whose entries are its blocks, kept alive
// here. Not thread-safe: one thread uses the stream.
class ResBlockInputStream : public BlockInputStream {
public:
    ResBlockInputStream(BlockOpener openBlock, unsigned int totalSize, unsigned int blockSize,
                        boost::shared_ptr<ResourceFile> resourceFile)
        : BlockInputStream(openBlock, totalSize, blockSize), resourceFile(resourceFile) {}

private:
    boost::shared_ptr<ResourceFile> resourceFile;
};

}  // namespace Resource
}  // namespace IO
