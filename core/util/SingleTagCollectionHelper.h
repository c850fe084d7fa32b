#pragma once

#include "util/TagCollectionHandler.h"

namespace Util {

// A handler for a collection that may appear at most once; subclasses handle the items.
// A missing collection is accepted when the helper was made optional.
// Used on the thread that runs the parse.
class SingleTagCollectionHelper : public TagCollectionHandler {
public:
    explicit SingleTagCollectionHelper(bool optional) : optional(optional) {}

    // Accepts the first collection element; logs "Several <name> tags" and stops on a second.
    bool onCollectionTag(const TiXmlElement* element) override;
    bool onCollectionTagNotFound() override;

private:
    bool collectionSeen = false;
    bool optional;
};

}  // namespace Util
