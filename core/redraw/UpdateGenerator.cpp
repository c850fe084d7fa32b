#include "redraw/UpdateGenerator.h"

#include "redraw/ViewRedrawManager.h"

namespace Redraw {

UpdateGenerator::UpdateGenerator(ViewRedrawManager& manager)
    : manager(manager), managerLifetime(manager.getLifetime()) {
    manager.increaseUpdateGeneratorCount();
}

UpdateGenerator::~UpdateGenerator() {
    if (!managerLifetime.expired()) {
        manager.decreaseUpdateGeneratorCount();
    }
}

}  // namespace Redraw
