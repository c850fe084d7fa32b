#pragma once

#include "render/api/Types.h"

namespace Render {
namespace API {

// How drawn colours combine with the target. Value type; any thread.
struct BlendState {
    static const BlendState ADDITIVE;
    static const BlendState ALPHA_BLEND;
    static const BlendState OPAQUE;

    bool enabled = false;
    BlendFunc source = BLEND_ONE;
    BlendFunc destination = BLEND_ZERO;
};

}  // namespace API
}  // namespace Render
