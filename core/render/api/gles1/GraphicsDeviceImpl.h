#pragma once

#include <boost/shared_ptr.hpp>

#include "render/api/GraphicsDevice.h"

namespace Render {
namespace API {
namespace GLES1 {

class ProgramImpl;

// The drawing interface on the OpenGL ES 1.x fixed-function pipeline.
// Vertex elements become client arrays ("vPosition", "vColor",
// "vTexCoord"); "aColor" is the current colour, "aMatrixWVP" the projection
// matrix, "aTextureScale" a scale of the texture matrix, "aPointSize" and
// "aLineSize" the point and line sizes; other constants go to the current
// program. Programs are declared by name, process-wide, before use.
//
// The current buffers and texture are bound again at each draw call, so
// creating or updating objects between set and draw cannot unbind them.
// Drawing thread only, with the context current.
class GraphicsDeviceImpl : public GraphicsDevice {
public:
    typedef boost::shared_ptr<ProgramImpl> (*ProgramCreator)();
    static const int kMaxPrograms = 32;

    // Logs the GL renderer, vendor and version and applies the default states.
    GraphicsDeviceImpl();

    // Registers creator under name (copied); asserts on a name already
    // declared or when kMaxPrograms are declared.
    static void declareProgram(const char* name, ProgramCreator creator);
    // Forgets every declared program, for embedders that restart the library.
    static void resetPrograms();

    // Not supported: the device lives as long as its context.
    void release() override;

    boost::shared_ptr<VertexBuffer> createVertexBuffer(unsigned size, const void* data) override;
    boost::shared_ptr<IndexBuffer> createIndexBuffer(unsigned count, const unsigned short* data) override;
    boost::shared_ptr<Texture2D> createTexture2D(unsigned width, unsigned height, TextureFormat format,
                                                 TextureFilter filter, TextureWrap wrapS, TextureWrap wrapT,
                                                 const void* data) override;
    // The program declared under first; second is not used by this device.
    boost::shared_ptr<Program> createProgram(const std::string& first, const std::string& second) override;

    void clearTarget(const Math::Color& color) override;
    void clearDepth() override;

    void setVertexBuffer(boost::shared_ptr<VertexBuffer> buffer) override;
    void setVertexBufferUP(const void* vertices, unsigned size) override;
    void setIndexBuffer(boost::shared_ptr<IndexBuffer> buffer) override;
    void setIndexBufferUP(const unsigned short* indices, unsigned count) override;
    void setVertexDeclaration(const VertexDeclaration& declaration) override;
    // Unit 0 only; a texture enables texturing, none disables it.
    void setTexture(int unit, boost::shared_ptr<Texture2D> texture) override;
    void setProgram(boost::shared_ptr<Program> program) override;
    void setConstant(const char* name, float value) override;
    void setConstant(const char* name, const float* values, unsigned count) override;

    void drawIndexedPrimitives(PrimitiveType type, int start, int count) override;
    void drawPrimitives(PrimitiveType type, int start, int count) override;

    void setBlendState(const BlendState& state) override;
    void setDepthStencilState(const DepthStencilState& state) override;
    void setRasterizerState(const RasterizerState& state) override;
    void setViewport(const Viewport& viewport) override;
    void setScissorRect(const ScissorRect& rect) override;

    DeviceImplType getDeviceType() const override { return DEVICE_GLES1; }

private:
    // True (logged) when GL reports an error. Asked after draw calls only, so
    // state changes cost no round trip to the driver.
    static bool checkError();

    // Binds the current sources and points the client arrays; false (after
    // an assertion) when there is nothing valid to draw from.
    bool assignPointers();
    void enableArray(unsigned array, bool& enabled, bool enable);
    bool bindIndexSource(const char*& base);

    const char* vertexPointer;
    const unsigned short* indexPointer;
    boost::shared_ptr<VertexBuffer> vertexBuffer;
    boost::shared_ptr<IndexBuffer> indexBuffer;
    boost::shared_ptr<Texture2D> texture;
    const VertexDeclaration* declaration;
    boost::shared_ptr<Program> program;
    bool positionArrayEnabled;
    bool colorArrayEnabled;
    bool texCoordArrayEnabled;
};

}  // namespace GLES1
}  // namespace API
}  // namespace Render
