#pragma once

namespace Render {

namespace API {
class GraphicsDevice;
}

// A GPU-side object in two steps: load (decode; may run on a worker thread)
// and cache (upload; drawing thread only). Subclasses implement the steps.
// One thread at a time: a resource is handed over whole between load and cache.
class Resource {
public:
    Resource() : cached(false), loaded(false) {}
    virtual ~Resource() {}

    void load();
    void cache(API::GraphicsDevice* device);
    void clear(API::GraphicsDevice* device);
    bool isLoaded() const { return loaded; }
    bool isCached() const { return cached; }

protected:
    virtual void doLoad() {}
    virtual void doCache(API::GraphicsDevice* device) = 0;
    virtual void doClear(API::GraphicsDevice* device) = 0;

private:
    Resource(const Resource&) = delete;
    Resource& operator=(const Resource&) = delete;

    bool cached;
    bool loaded;
};

}  // namespace Render
