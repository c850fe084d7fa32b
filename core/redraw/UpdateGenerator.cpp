#include "redraw/UpdateGenerator.h"

#include "redraw/ViewRedrawManager.h"

namespace Redraw {

UpdateGenerator::UpdateGenerator(ViewRedrawManager& manager) : manager(manager) {
    manager.increaseUpdateGeneratorCount();
}

UpdateGenerator::~UpdateGenerator() {
    manager.decreaseUpdateGeneratorCount();
}

}  // namespace Redraw
