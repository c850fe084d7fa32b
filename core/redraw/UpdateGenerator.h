#pragma once

namespace Redraw {

class ViewRedrawManager;

// Keeps the view updating on every tick while it exists, e.g. for the length
// of an animation. Main thread only; must not outlive the manager.
class UpdateGenerator {
public:
    explicit UpdateGenerator(ViewRedrawManager& manager);
    ~UpdateGenerator();

private:
    UpdateGenerator(const UpdateGenerator&) = delete;
    UpdateGenerator& operator=(const UpdateGenerator&) = delete;

    ViewRedrawManager& manager;
};

}  // namespace Redraw
