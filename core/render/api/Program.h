#pragma once

#include "render/api/GraphicsResource.h"

namespace Render {
namespace API {

// How vertices and fragments are processed, made by the device by name.
// Drawing thread only.
class Program : public GraphicsResource {
public:
    // Called by the device when the program is set.
    virtual void apply() = 0;
    // A constant the device itself does not handle.
    virtual void setConstant(const char* name, const float* values, unsigned count) = 0;
};

}  // namespace API
}  // namespace Render
