#pragma once

#include "render/api/Types.h"

namespace Render {
namespace API {

// Value type; any thread.
struct DepthStencilState {
    bool depthTest = false;
    bool depthWrite = true;
    CompareFunc compare = CMP_LESS;
};

}  // namespace API
}  // namespace Render
