#include "render/api/gles1/VertexBufferImpl.h"

namespace Render {
namespace API {
namespace GLES1 {

VertexBufferImpl::VertexBufferImpl(unsigned size, const void* data) : name(0) {
    glGenBuffers(1, &name);
    glBindBuffer(GL_ARRAY_BUFFER, name);
    glBufferData(GL_ARRAY_BUFFER, size, data, GL_STATIC_DRAW);
    glBindBuffer(GL_ARRAY_BUFFER, 0);
}

void VertexBufferImpl::release() {
    if (name != 0) {
        glDeleteBuffers(1, &name);
        name = 0;
    }
}

void VertexBufferImpl::setData(const void* data, unsigned offset, unsigned size) {
    if (name == 0) {
        return;
    }
    glBindBuffer(GL_ARRAY_BUFFER, name);
    glBufferSubData(GL_ARRAY_BUFFER, offset, size, data);
    glBindBuffer(GL_ARRAY_BUFFER, 0);
}

}  // namespace GLES1
}  // namespace API
}  // namespace Render
