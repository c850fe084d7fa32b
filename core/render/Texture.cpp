#include "render/Texture.h"

#include <KD/kd.h>

#include <boost/make_shared.hpp>

#include "render/TextureFactory.h"

namespace Render {

Texture::Texture(const boost::shared_ptr<Accessor>& accessor, Filter filter, WrapMode wrapS, WrapMode wrapT)
    : ResourceDesc(boost::make_shared<TextureFactory>(), REQUIRED),
      accessor(accessor),
      filter(filter),
      wrapS(wrapS),
      wrapT(wrapT),
      width(0),
      height(0) {
    boost::shared_ptr<Image> decoded = getImage();
    if (decoded) {
        width = decoded->getWidth();
        height = decoded->getHeight();
    }
}

boost::shared_ptr<Image> Texture::getImage() const {
    if (!image && accessor) {
        image = accessor->getImage();
    }
    KD_ASSERT(image);
    return image;
}

void Texture::release() const {
    image.reset();
}

void Texture::onCached() const {
    getImage();
}

}  // namespace Render
