#pragma once

#include "render/api/Types.h"

namespace Render {
namespace API {

// Value type; any thread. The depth biases are kept for devices that use
// them; the fixed-function device only stores them.
struct RasterizerState {
    CullMode cullMode = CULL_NONE;
    float depthBias = 0.0f;
    float slopeScaledDepthBias = 0.0f;
    bool scissorTest = false;
    bool lineSmooth = false;
};

}  // namespace API
}  // namespace Render
