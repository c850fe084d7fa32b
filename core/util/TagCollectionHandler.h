#pragma once

class TiXmlElement;

namespace Util {

// Receives the collections and items found by XmlUtils::parseTagCollections; returning false
// from any call stops the walk. Called on the thread that runs the parse.
class TagCollectionHandler {
public:
    virtual ~TagCollectionHandler() {}

    virtual bool onCollectionTag(const TiXmlElement* element) = 0;
    virtual bool onItemTag(const TiXmlElement* element) = 0;
    // Whether a parent without any collection element is acceptable.
    virtual bool onCollectionTagNotFound() = 0;
};

}  // namespace Util
