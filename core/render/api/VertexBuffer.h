#pragma once

#include "render/api/GraphicsResource.h"

namespace Render {
namespace API {

// Vertex data on the device. Drawing thread only.
class VertexBuffer : public GraphicsResource {
public:
    // Replaces size bytes from byte offset.
    virtual void setData(const void* data, unsigned offset, unsigned size) = 0;
};

}  // namespace API
}  // namespace Render
