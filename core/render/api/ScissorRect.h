#pragma once

namespace Render {
namespace API {

// In target pixels from the lower-left corner. Value type; any thread.
struct ScissorRect {
    int x = 0;
    int y = 0;
    int width = 0;
    int height = 0;
};

}  // namespace API
}  // namespace Render
