#pragma once

#include "render/ResourceLink.h"

namespace Render {

// Drawing thread only.
class ResourceLinkImpl : public ResourceLink {
public:
    ResourceLinkImpl(const ResourceDesc* desc, const boost::shared_ptr<Resource>& resource)
        : desc(desc), resource(resource) {}

    const ResourceDesc* getDesc() const override { return desc; }
    void clearDesc() override { desc = nullptr; }
    const boost::shared_ptr<Resource>& getResource() const override { return resource; }

private:
    const ResourceDesc* desc;
    boost::shared_ptr<Resource> resource;
};

}  // namespace Render
