#pragma once

#include <GLES/gl.h>

#include "render/api/IndexBuffer.h"

namespace Render {
namespace API {
namespace GLES1 {

// A GL element array buffer of 16-bit indices. Drawing thread only, with its context current.
class IndexBufferImpl : public IndexBuffer {
public:
    IndexBufferImpl(unsigned count, const unsigned short* indices);

    // Deletes the GL buffer; a second call does nothing.
    void release() override;
    void setIndices(const unsigned short* indices, unsigned offset, unsigned count) override;

    // The GL buffer name; 0 once released.
    GLuint getName() const { return name; }

private:
    GLuint name;
};

}  // namespace GLES1
}  // namespace API
}  // namespace Render
