#pragma once

namespace Render {
namespace API {

// An object that lives on the graphics device. release() frees the device
// side; the object then stays valid but must not be used for drawing.
// Drawing thread only.
class GraphicsResource {
public:
    virtual ~GraphicsResource() {}
    virtual void release() = 0;
};

}  // namespace API
}  // namespace Render
