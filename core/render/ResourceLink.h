#pragma once

#include <boost/shared_ptr.hpp>

namespace Render {

class Resource;
class ResourceDesc;

// The manager's record of one registered descriptor and its resource. The
// descriptor is cleared when it leaves the manager, while the link waits for
// the next frame to release the resource. Drawing thread only.
class ResourceLink {
public:
    virtual ~ResourceLink() {}
    // Null once the descriptor has left.
    virtual const ResourceDesc* getDesc() const = 0;
    virtual void clearDesc() = 0;
    virtual const boost::shared_ptr<Resource>& getResource() const = 0;
};

}  // namespace Render
