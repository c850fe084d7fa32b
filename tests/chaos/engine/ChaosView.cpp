#include "ChaosView.h"

#include <GLES/gl.h>

void ChaosView::update(int elapsedMs) {
    // The size check may hide and delete this view through onSizeChanged().
    const std::shared_ptr<bool> stillAlive = alive;
    BaseView::update(elapsedMs);
    if (*stillAlive) {
        hideIf(HideOnUpdate);
    }
}

void ChaosView::redraw() {
    if (!hideIf(HideOnRedraw)) {
        BaseView::redraw();
    }
}

void ChaosView::draw() {
    if (!hideIf(HideOnDraw)) {
        glClearColor(0.2f, 0.4f, 0.6f, 1.0f);
        glClear(GL_COLOR_BUFFER_BIT);
    }
}

void ChaosView::onSizeChanged() {
    hideIf(HideOnSizeChanged);
}

bool ChaosView::hideIf(Reentry due) {
    if (reentry != due) {
        return false;
    }
    reentry = NoReentry;
    hideHook(*this, deleteInside);
    return true;
}
