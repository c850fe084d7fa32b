#include "render/api/GraphicsDevice.h"

#include <KD/kd.h>

#include "render/api/BlendState.h"
#include "render/api/UniformConstants.h"
#include "render/api/VertexDeclaration.h"
#include "render/api/gles1/GraphicsDeviceImpl.h"

namespace Render {
namespace API {

const BlendState BlendState::ADDITIVE = {true, BLEND_SRC_ALPHA, BLEND_ONE};
const BlendState BlendState::ALPHA_BLEND = {true, BLEND_SRC_ALPHA, BLEND_ONE_MINUS_SRC_ALPHA};
const BlendState BlendState::OPAQUE = {false, BLEND_ONE, BLEND_ZERO};

const char* const VertexDeclaration::USAGE_POSITION = "vPosition";
const char* const VertexDeclaration::USAGE_COLOR = "vColor";
const char* const VertexDeclaration::USAGE_TEXCOORD = "vTexCoord";

const char* const UniformConstants::UNIFORM_COLOR = "aColor";
const char* const UniformConstants::UNIFORM_AMBIENT = "aAmbient";
const char* const UniformConstants::UNIFORM_POINT_SIZE = "aPointSize";
const char* const UniformConstants::UNIFORM_LINE_SIZE = "aLineSize";
const char* const UniformConstants::UNIFORM_MATRIX_WVP = "aMatrixWVP";
const char* const UniformConstants::UNIFORM_TEXTURE_SCALE = "aTextureScale";

boost::shared_ptr<GraphicsDevice> GraphicsDevice::create() {
    return boost::shared_ptr<GraphicsDevice>(new GLES1::GraphicsDeviceImpl());
}

const char* GraphicsDevice::getDeviceString(DeviceImplType type) {
    switch (type) {
        case DEVICE_GLES1:
            return "gles1";
        case DEVICE_GLES2:
            return "gles2";
        case DEVICE_D3D10:
            return "d3d10";
    }
    KD_ASSERT(false);
    return "";
}

}  // namespace API
}  // namespace Render
