#include "render/api/gles1/IndexBufferImpl.h"

namespace Render {
namespace API {
namespace GLES1 {

IndexBufferImpl::IndexBufferImpl(unsigned count, const unsigned short* indices) : name(0) {
    glGenBuffers(1, &name);
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, name);
    glBufferData(GL_ELEMENT_ARRAY_BUFFER, count * sizeof(unsigned short), indices, GL_STATIC_DRAW);
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, 0);
}

void IndexBufferImpl::release() {
    if (name != 0) {
        glDeleteBuffers(1, &name);
        name = 0;
    }
}

void IndexBufferImpl::setIndices(const unsigned short* indices, unsigned offset, unsigned count) {
    if (name == 0) {
        return;
    }
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, name);
    glBufferSubData(GL_ELEMENT_ARRAY_BUFFER, offset * sizeof(unsigned short), count * sizeof(unsigned short),
                    indices);
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, 0);
}

}  // namespace GLES1
}  // namespace API
}  // namespace Render
