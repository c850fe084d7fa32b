#include "render/Resource.h"

#include <KD/kd.h>

namespace Render {

// Misuse is reported and then refused, so a resource never decodes or uploads
// itself twice and never frees what it does not hold.

void Resource::load() {
    KD_ASSERT(!loaded);
    if (loaded) {
        return;
    }
    loaded = true;
    doLoad();
}

void Resource::cache(API::GraphicsDevice* device) {
    KD_ASSERT(!cached);
    if (cached) {
        return;
    }
    doCache(device);
    cached = true;
}

void Resource::clear(API::GraphicsDevice* device) {
    KD_ASSERT(cached);
    if (!cached) {
        return;
    }
    doClear(device);
    cached = false;
}

}  // namespace Render
