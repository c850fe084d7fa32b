#include "render/TextureFactory.h"

#include "render/Texture.h"
#include "render/TextureResource.h"

namespace Render {

boost::shared_ptr<Resource> TextureFactory::create(const ResourceDesc* desc) {
    return boost::shared_ptr<Resource>(new TextureResource(static_cast<const Texture*>(desc)));
}

}  // namespace Render
