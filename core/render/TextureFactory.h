#pragma once

#include "render/ResourceFactory.h"

namespace Render {

// Makes a TextureResource for a Texture descriptor. Any thread.
class TextureFactory : public ResourceFactory {
public:
    boost::shared_ptr<Resource> create(const ResourceDesc* desc) override;
};

}  // namespace Render
