#pragma once

namespace Render {
namespace API {

// The drawing side of the graphics context that resources upload themselves
// to. The resource manager only hands it on to the resources; it never calls
// it. Drawing (main) thread only.
class GraphicsDevice {
public:
    virtual ~GraphicsDevice() {}
};

}  // namespace API
}  // namespace Render
