#pragma once

namespace Redraw {

// What the redraw manager drives: an animation step and a redraw. Called on
// the main thread from the redraw timer.
class ViewRedrawManagerDelegate {
public:
    virtual ~ViewRedrawManagerDelegate() {}
    // elapsedMs: time since the previous update, 5 to 200 ms.
    virtual void update(int elapsedMs) = 0;
    virtual void redraw() = 0;
};

}  // namespace Redraw
