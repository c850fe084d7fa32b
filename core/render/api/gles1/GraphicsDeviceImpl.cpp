#include "render/api/gles1/GraphicsDeviceImpl.h"

#include <GLES/gl.h>
#include <KD/kd.h>

#include <cstdint>
#include <cstring>
#include <string>

#include "math/Color.h"
#include "math/Matrix.h"
#include "render/api/UniformConstants.h"
#include "render/api/VertexDeclaration.h"
#include "render/api/gles1/IndexBufferImpl.h"
#include "render/api/gles1/ProgramImpl.h"
#include "render/api/gles1/Texture2DImpl.h"
#include "render/api/gles1/VertexBufferImpl.h"
#include "util/Logger.h"

namespace Render {
namespace API {
namespace GLES1 {

namespace {

const GLenum BLEND_FACTOR[] = {GL_SRC_COLOR,
                               GL_DST_COLOR,
                               GL_SRC_ALPHA,
                               GL_DST_ALPHA,
                               GL_ONE_MINUS_SRC_COLOR,
                               GL_ONE_MINUS_DST_COLOR,
                               GL_ONE_MINUS_SRC_ALPHA,
                               GL_ONE_MINUS_DST_ALPHA,
                               GL_ONE,
                               GL_ZERO};
const GLenum CMP[] = {GL_ALWAYS, GL_EQUAL, GL_GREATER, GL_GEQUAL, GL_LESS, GL_LEQUAL, GL_NEVER, GL_NOTEQUAL};
const GLenum PRIMITIVE[] = {GL_TRIANGLES,  GL_TRIANGLE_FAN, GL_TRIANGLE_STRIP, GL_LINES,
                            GL_LINE_STRIP, GL_LINE_LOOP,    GL_POINTS};
const GLint TYPE_COUNT[] = {1, 2, 3, 4, 2, 3, 4, 4};
const GLenum TYPE_TYPE[] = {GL_FLOAT, GL_FLOAT, GL_FLOAT, GL_FLOAT,
                            GL_SHORT, GL_SHORT, GL_SHORT, GL_UNSIGNED_BYTE};

template <typename T, size_t N>
bool inTable(const T (&)[N], int index) {
    return index >= 0 && static_cast<size_t>(index) < N;
}

// Process-wide, like the programs an application declares at start.
int creatorsCount = 0;
std::string creatorNames[GraphicsDeviceImpl::kMaxPrograms];
GraphicsDeviceImpl::ProgramCreator creators[GraphicsDeviceImpl::kMaxPrograms];

bool isNamed(const char* name, const char* constant) {
    return name == constant || (name != nullptr && std::strcmp(name, constant) == 0);
}

// A base of null stands for the start of the bound buffer: the result is
// then an offset in it, which plain pointer arithmetic may not produce.
const GLvoid* offsetPointer(const char* base, long offset) {
    return reinterpret_cast<const GLvoid*>(reinterpret_cast<uintptr_t>(base) + offset);
}

const char* glString(GLenum name) {
    const GLubyte* text = glGetString(name);
    return text != nullptr ? reinterpret_cast<const char*>(text) : "";
}

}  // namespace

GraphicsDeviceImpl::GraphicsDeviceImpl()
    : vertexPointer(nullptr),
      indexPointer(nullptr),
      declaration(nullptr),
      positionArrayEnabled(false),
      colorArrayEnabled(false),
      texCoordArrayEnabled(false) {
    Logger::log(Logger::Info, "GLES1");
    Logger::log(Logger::Info, "GL Renderer: %s", glString(GL_RENDERER));
    Logger::log(Logger::Info, "GL Vendor: %s", glString(GL_VENDOR));
    Logger::log(Logger::Info, "GL Version: %s", glString(GL_VERSION));
    setBlendState(BlendState());
    setDepthStencilState(DepthStencilState());
    setRasterizerState(RasterizerState());
    setViewport(Viewport());
    setScissorRect(ScissorRect());
}

void GraphicsDeviceImpl::declareProgram(const char* name, ProgramCreator creator) {
    for (int i = 0; i < creatorsCount; ++i) {
        if (creatorNames[i] == name) {
            kdHandleAssertion("program declared twice", __FILE__, __LINE__);
            return;
        }
    }
    if (creatorsCount >= kMaxPrograms) {
        kdHandleAssertion("too many programs", __FILE__, __LINE__);
        return;
    }
    creatorNames[creatorsCount] = name;
    creators[creatorsCount] = creator;
    ++creatorsCount;
}

void GraphicsDeviceImpl::resetPrograms() {
    for (int i = 0; i < creatorsCount; ++i) {
        creatorNames[i].clear();
        creators[i] = nullptr;
    }
    creatorsCount = 0;
}

void GraphicsDeviceImpl::release() {
    kdHandleAssertion("GraphicsDeviceImpl::release is not supported", __FILE__, __LINE__);
}

boost::shared_ptr<VertexBuffer> GraphicsDeviceImpl::createVertexBuffer(unsigned size, const void* data) {
    boost::shared_ptr<VertexBuffer> buffer(new VertexBufferImpl(size, data));
    return buffer;
}

boost::shared_ptr<IndexBuffer> GraphicsDeviceImpl::createIndexBuffer(unsigned count,
                                                                     const unsigned short* data) {
    boost::shared_ptr<IndexBuffer> buffer(new IndexBufferImpl(count, data));
    return buffer;
}

boost::shared_ptr<Texture2D> GraphicsDeviceImpl::createTexture2D(unsigned width, unsigned height,
                                                                 TextureFormat format, TextureFilter filter,
                                                                 TextureWrap wrapS, TextureWrap wrapT,
                                                                 const void* data) {
    KD_ASSERT(format >= FORMAT_RGB && format <= FORMAT_PALETTE8_RGB8);
    if (format < FORMAT_RGB || format > FORMAT_PALETTE8_RGB8) {
        return boost::shared_ptr<Texture2D>();
    }
    boost::shared_ptr<Texture2D> created(
        new Texture2DImpl(width, height, format, filter, wrapS, wrapT, data));
    return created;
}

boost::shared_ptr<Program> GraphicsDeviceImpl::createProgram(const std::string& first, const std::string&) {
    for (int i = 0; i < creatorsCount; ++i) {
        if (creatorNames[i] == first) {
            return creators[i]();
        }
    }
    kdHandleAssertion("unknown program", __FILE__, __LINE__);
    return boost::shared_ptr<Program>();
}

void GraphicsDeviceImpl::clearTarget(const Math::Color& color) {
    glClearColor(color.r / 255.0f, color.g / 255.0f, color.b / 255.0f, color.a / 255.0f);
    glClear(GL_COLOR_BUFFER_BIT);
}

void GraphicsDeviceImpl::clearDepth() {
    glClear(GL_DEPTH_BUFFER_BIT);
}

void GraphicsDeviceImpl::setVertexBuffer(boost::shared_ptr<VertexBuffer> buffer) {
    vertexBuffer = buffer;
    vertexPointer = nullptr;
    glBindBuffer(GL_ARRAY_BUFFER, buffer ? static_cast<VertexBufferImpl*>(buffer.get())->getName() : 0);
}

void GraphicsDeviceImpl::setVertexBufferUP(const void* vertices, unsigned) {
    vertexBuffer.reset();
    vertexPointer = static_cast<const char*>(vertices);
    glBindBuffer(GL_ARRAY_BUFFER, 0);
}

void GraphicsDeviceImpl::setIndexBuffer(boost::shared_ptr<IndexBuffer> buffer) {
    indexBuffer = buffer;
    indexPointer = nullptr;
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER,
                 buffer ? static_cast<IndexBufferImpl*>(buffer.get())->getName() : 0);
}

void GraphicsDeviceImpl::setIndexBufferUP(const unsigned short* indices, unsigned) {
    indexBuffer.reset();
    indexPointer = indices;
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, 0);
}

void GraphicsDeviceImpl::setVertexDeclaration(const VertexDeclaration& newDeclaration) {
    declaration = &newDeclaration;
}

void GraphicsDeviceImpl::setTexture(int unit, boost::shared_ptr<Texture2D> newTexture) {
    KD_ASSERT(unit == 0);
    if (unit != 0) {
        return;
    }
    texture = newTexture;
    if (texture) {
        glEnable(GL_TEXTURE_2D);
        glBindTexture(GL_TEXTURE_2D, static_cast<Texture2DImpl*>(texture.get())->getName());
    } else {
        glBindTexture(GL_TEXTURE_2D, 0);
        glDisable(GL_TEXTURE_2D);
    }
}

void GraphicsDeviceImpl::setProgram(boost::shared_ptr<Program> newProgram) {
    program = newProgram;
    if (program) {
        program->apply();
    }
}

void GraphicsDeviceImpl::setConstant(const char* name, float value) {
    if (isNamed(name, UniformConstants::UNIFORM_LINE_SIZE)) {
        glLineWidth(value);
    } else if (isNamed(name, UniformConstants::UNIFORM_POINT_SIZE)) {
        glPointSize(value);
    } else if (isNamed(name, UniformConstants::UNIFORM_TEXTURE_SCALE)) {
        Matrix scale = Matrix::IDENTITY;
        scale.scale(Vertex<3, float>(value, value, value));
        glMatrixMode(GL_TEXTURE);
        glLoadMatrixf(scale.m);
    } else {
        kdHandleAssertion("unknown constant", __FILE__, __LINE__);
    }
}

void GraphicsDeviceImpl::setConstant(const char* name, const float* values, unsigned count) {
    if (isNamed(name, UniformConstants::UNIFORM_COLOR)) {
        KD_ASSERT(count == 4);
        if (count == 4) {
            glColor4f(values[0], values[1], values[2], values[3]);
        }
    } else if (isNamed(name, UniformConstants::UNIFORM_MATRIX_WVP)) {
        KD_ASSERT(count == 16);
        if (count == 16) {
            glMatrixMode(GL_PROJECTION);
            glLoadMatrixf(values);
        }
    } else if (program) {
        program->setConstant(name, values, count);
    } else {
        kdHandleAssertion("no program for constant", __FILE__, __LINE__);
    }
}

void GraphicsDeviceImpl::drawIndexedPrimitives(PrimitiveType type, int start, int count) {
    KD_ASSERT(inTable(PRIMITIVE, type));
    const char* indexBase = nullptr;
    if (!inTable(PRIMITIVE, type) || !assignPointers() || !bindIndexSource(indexBase)) {
        return;
    }
    glDrawElements(PRIMITIVE[type], count, GL_UNSIGNED_SHORT,
                   offsetPointer(indexBase, start * static_cast<long>(sizeof(unsigned short))));
    bool failed = checkError();
    KD_ASSERT(!failed);
}

void GraphicsDeviceImpl::drawPrimitives(PrimitiveType type, int start, int count) {
    KD_ASSERT(inTable(PRIMITIVE, type));
    if (!inTable(PRIMITIVE, type) || !assignPointers()) {
        return;
    }
    glDrawArrays(PRIMITIVE[type], start, count);
    bool failed = checkError();
    KD_ASSERT(!failed);
}

void GraphicsDeviceImpl::setBlendState(const BlendState& state) {
    KD_ASSERT(inTable(BLEND_FACTOR, state.source) && inTable(BLEND_FACTOR, state.destination));
    if (!inTable(BLEND_FACTOR, state.source) || !inTable(BLEND_FACTOR, state.destination)) {
        return;
    }
    GraphicsDevice::setBlendState(state);
    if (state.enabled) {
        glEnable(GL_BLEND);
    } else {
        glDisable(GL_BLEND);
    }
    glBlendFunc(BLEND_FACTOR[state.source], BLEND_FACTOR[state.destination]);
}

void GraphicsDeviceImpl::setDepthStencilState(const DepthStencilState& state) {
    KD_ASSERT(inTable(CMP, state.compare));
    if (!inTable(CMP, state.compare)) {
        return;
    }
    GraphicsDevice::setDepthStencilState(state);
    if (state.depthTest) {
        glEnable(GL_DEPTH_TEST);
    } else {
        glDisable(GL_DEPTH_TEST);
    }
    glDepthMask(state.depthWrite ? GL_TRUE : GL_FALSE);
    glDepthFunc(CMP[state.compare]);
}

void GraphicsDeviceImpl::setRasterizerState(const RasterizerState& state) {
    GraphicsDevice::setRasterizerState(state);
    if (state.cullMode == CULL_BACK || state.cullMode == CULL_FRONT) {
        glEnable(GL_CULL_FACE);
        glCullFace(state.cullMode == CULL_BACK ? GL_BACK : GL_FRONT);
    } else {
        glDisable(GL_CULL_FACE);
    }
    if (state.scissorTest) {
        glEnable(GL_SCISSOR_TEST);
    } else {
        glDisable(GL_SCISSOR_TEST);
    }
    if (state.lineSmooth) {
        glEnable(GL_LINE_SMOOTH);
    } else {
        glDisable(GL_LINE_SMOOTH);
    }
}

void GraphicsDeviceImpl::setViewport(const Viewport& newViewport) {
    GraphicsDevice::setViewport(newViewport);
    glViewport(newViewport.x, newViewport.y, newViewport.width, newViewport.height);
}

void GraphicsDeviceImpl::setScissorRect(const ScissorRect& rect) {
    GraphicsDevice::setScissorRect(rect);
    glScissor(rect.x, rect.y, rect.width, rect.height);
}

bool GraphicsDeviceImpl::checkError() {
    GLenum error = glGetError();
    if (error == GL_NO_ERROR) {
        return false;
    }
    Logger::log(Logger::Error, "glGetError(): %x", error);
    return true;
}

bool GraphicsDeviceImpl::assignPointers() {
    GLuint bufferName = vertexBuffer ? static_cast<VertexBufferImpl*>(vertexBuffer.get())->getName() : 0;
    // Offsets from a null base would make GL read near address 0.
    const bool hasSource = bufferName != 0 || vertexPointer != nullptr;
    KD_ASSERT(declaration != nullptr && hasSource);
    if (declaration == nullptr || !hasSource) {
        return false;
    }
    glBindBuffer(GL_ARRAY_BUFFER, bufferName);
    if (texture) {
        glBindTexture(GL_TEXTURE_2D, static_cast<Texture2DImpl*>(texture.get())->getName());
    }
    bool usePosition = false;
    bool useColor = false;
    bool useTexCoord = false;
    for (const VertexDeclaration::Element& element : declaration->elements) {
        KD_ASSERT(inTable(TYPE_COUNT, element.type));
        if (!inTable(TYPE_COUNT, element.type)) {
            return false;
        }
        const GLint size = TYPE_COUNT[element.type];
        const GLenum type = TYPE_TYPE[element.type];
        const GLvoid* pointer = offsetPointer(vertexPointer, element.offset);
        if (element.usage == VertexDeclaration::USAGE_POSITION) {
            usePosition = true;
            enableArray(GL_VERTEX_ARRAY, positionArrayEnabled, true);
            glVertexPointer(size, type, declaration->stride, pointer);
        } else if (element.usage == VertexDeclaration::USAGE_COLOR) {
            useColor = true;
            enableArray(GL_COLOR_ARRAY, colorArrayEnabled, true);
            glColorPointer(size, type, declaration->stride, pointer);
        } else if (element.usage == VertexDeclaration::USAGE_TEXCOORD) {
            useTexCoord = true;
            enableArray(GL_TEXTURE_COORD_ARRAY, texCoordArrayEnabled, true);
            glTexCoordPointer(size, type, declaration->stride, pointer);
        } else {
            kdHandleAssertion("unknown vertex usage", __FILE__, __LINE__);
            return false;
        }
    }
    enableArray(GL_VERTEX_ARRAY, positionArrayEnabled, usePosition);
    enableArray(GL_COLOR_ARRAY, colorArrayEnabled, useColor);
    enableArray(GL_TEXTURE_COORD_ARRAY, texCoordArrayEnabled, useTexCoord);
    return true;
}

void GraphicsDeviceImpl::enableArray(unsigned array, bool& enabled, bool enable) {
    if (enabled == enable) {
        return;
    }
    if (enable) {
        glEnableClientState(array);
    } else {
        glDisableClientState(array);
    }
    enabled = enable;
}

bool GraphicsDeviceImpl::bindIndexSource(const char*& base) {
    GLuint bufferName = indexBuffer ? static_cast<IndexBufferImpl*>(indexBuffer.get())->getName() : 0;
    const bool hasSource = bufferName != 0 || indexPointer != nullptr;
    KD_ASSERT(hasSource);
    if (!hasSource) {
        return false;
    }
    glBindBuffer(GL_ELEMENT_ARRAY_BUFFER, bufferName);
    base = reinterpret_cast<const char*>(indexPointer);
    return true;
}

}  // namespace GLES1
}  // namespace API
}  // namespace Render
