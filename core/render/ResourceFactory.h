#pragma once

#include <boost/shared_ptr.hpp>

namespace Render {

class Resource;
class ResourceDesc;

// Makes the resource a descriptor stands for. Called on the thread that loads
// (worker or drawing thread); implementations must allow either.
class ResourceFactory {
public:
    virtual ~ResourceFactory() {}
    // The new resource, neither loaded nor cached.
    virtual boost::shared_ptr<Resource> create(const ResourceDesc* desc) = 0;
};

}  // namespace Render
