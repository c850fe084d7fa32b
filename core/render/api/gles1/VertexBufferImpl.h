#pragma once

#include <GLES/gl.h>

#include "render/api/VertexBuffer.h"

namespace Render {
namespace API {
namespace GLES1 {

// A GL array buffer. Drawing thread only, with its context current.
class VertexBufferImpl : public VertexBuffer {
public:
    VertexBufferImpl(unsigned size, const void* data);

    // Deletes the GL buffer; a second call does nothing.
    void release() override;
    void setData(const void* data, unsigned offset, unsigned size) override;

    // The GL buffer name; 0 once released.
    GLuint getName() const { return name; }

private:
    GLuint name;
};

}  // namespace GLES1
}  // namespace API
}  // namespace Render
