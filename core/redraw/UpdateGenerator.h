#pragma once

#include <boost/weak_ptr.hpp>

namespace Redraw {

class ViewRedrawManager;

// Keeps the view updating on every tick while it exists, e.g. for the length
// of an animation. Main thread only. It may outlive its manager (the view was
// hidden before the animation ended) and then does nothing when it goes.
class UpdateGenerator {
public:
    explicit UpdateGenerator(ViewRedrawManager& manager);
    ~UpdateGenerator();

private:
    UpdateGenerator(const UpdateGenerator&) = delete;
    UpdateGenerator& operator=(const UpdateGenerator&) = delete;

    ViewRedrawManager& manager;
    const boost::weak_ptr<void> managerLifetime;
};

}  // namespace Redraw
