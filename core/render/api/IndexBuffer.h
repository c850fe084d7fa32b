#pragma once

#include "render/api/GraphicsResource.h"

namespace Render {
namespace API {

// 16-bit indices on the device. Drawing thread only.
class IndexBuffer : public GraphicsResource {
public:
    // Replaces count indices from index offset (both counted in indices, as
    // the buffer was created).
    virtual void setIndices(const unsigned short* indices, unsigned offset, unsigned count) = 0;
};

}  // namespace API
}  // namespace Render
