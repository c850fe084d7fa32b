#pragma once

#include <boost/shared_ptr.hpp>
#include <string>

#include "render/api/BlendState.h"
#include "render/api/DepthStencilState.h"
#include "render/api/RasterizerState.h"
#include "render/api/ScissorRect.h"
#include "render/api/Types.h"
#include "render/api/Viewport.h"

namespace Math {
class Color;
}

namespace Render {
namespace API {

class IndexBuffer;
class Program;
class Texture2D;
class VertexBuffer;
struct VertexDeclaration;

// The drawing interface of one graphics context, shaped like a programmable
// pipeline: vertex elements and constants are addressed by name
// (VertexDeclaration::USAGE_*, UniformConstants). Objects it creates belong
// to the context; the resource manager and textures release them through
// their own release(). Drawing thread only, with the context current.
class GraphicsDevice {
public:
    virtual ~GraphicsDevice() {}

    // The device for the current context (the fixed-function GLES 1.x one).
    static boost::shared_ptr<GraphicsDevice> create();
    // "gles1", "gles2" or "d3d10"; an assertion and "" for other values.
    static const char* getDeviceString(DeviceImplType type);

    virtual void release() = 0;

    virtual boost::shared_ptr<VertexBuffer> createVertexBuffer(unsigned size, const void* data) = 0;
    virtual boost::shared_ptr<IndexBuffer> createIndexBuffer(unsigned count, const unsigned short* data) = 0;
    // data (may be null) holds width × height pixels in format, rows from y 0.
    virtual boost::shared_ptr<Texture2D> createTexture2D(unsigned width, unsigned height,
                                                         TextureFormat format, TextureFilter filter,
                                                         TextureWrap wrapS, TextureWrap wrapT,
                                                         const void* data) = 0;
    virtual boost::shared_ptr<Program> createProgram(const std::string& first, const std::string& second) = 0;

    virtual void clearTarget(const Math::Color& color) = 0;
    virtual void clearDepth() = 0;

    // A bound buffer, or vertices / indices the caller keeps alive until the
    // draw calls that use them have returned.
    virtual void setVertexBuffer(boost::shared_ptr<VertexBuffer> buffer) = 0;
    virtual void setVertexBufferUP(const void* vertices, unsigned size) = 0;
    virtual void setIndexBuffer(boost::shared_ptr<IndexBuffer> buffer) = 0;
    virtual void setIndexBufferUP(const unsigned short* indices, unsigned count) = 0;
    // The caller keeps the declaration alive while it is set.
    virtual void setVertexDeclaration(const VertexDeclaration& declaration) = 0;
    virtual void setTexture(int unit, boost::shared_ptr<Texture2D> texture) = 0;
    virtual void setProgram(boost::shared_ptr<Program> program) = 0;
    virtual void setConstant(const char* name, float value) = 0;
    virtual void setConstant(const char* name, const float* values, unsigned count) = 0;

    // start and count in indices of the index source.
    virtual void drawIndexedPrimitives(PrimitiveType type, int start, int count) = 0;
    // start and count in vertices.
    virtual void drawPrimitives(PrimitiveType type, int start, int count) = 0;

    // The base versions only store the block.
    virtual void setBlendState(const BlendState& state) { blendState = state; }
    virtual void setDepthStencilState(const DepthStencilState& state) { depthStencilState = state; }
    virtual void setRasterizerState(const RasterizerState& state) { rasterizerState = state; }
    virtual void setViewport(const Viewport& viewport) { this->viewport = viewport; }
    virtual void setScissorRect(const ScissorRect& rect) { scissorRect = rect; }

    virtual DeviceImplType getDeviceType() const = 0;

    const BlendState& getBlendState() const { return blendState; }
    const DepthStencilState& getDepthStencilState() const { return depthStencilState; }
    const RasterizerState& getRasterizerState() const { return rasterizerState; }
    const Viewport& getViewport() const { return viewport; }
    const ScissorRect& getScissorRect() const { return scissorRect; }

protected:
    GraphicsDevice() {}

    BlendState blendState;
    DepthStencilState depthStencilState;
    RasterizerState rasterizerState;
    Viewport viewport;
    ScissorRect scissorRect;

private:
    GraphicsDevice(const GraphicsDevice&) = delete;
    GraphicsDevice& operator=(const GraphicsDevice&) = delete;
};

}  // namespace API
}  // namespace Render
