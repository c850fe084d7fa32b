#include "ChaosView.h"

#include <GLES/gl.h>

void ChaosView::update(int elapsedMs) {
    BaseView::update(elapsedMs);
    hideIf(HideOnUpdate);
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
    hideHook(*this);
    return true;
}
