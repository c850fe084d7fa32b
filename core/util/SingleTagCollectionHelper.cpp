#include "util/SingleTagCollectionHelper.h"

#include <KD/kd.h>
#include <tinyxml.h>

namespace Util {

bool SingleTagCollectionHelper::onCollectionTag(const TiXmlElement* element) {
    KD_ASSERT(element);
    if (!element) {
        return false;
    }
    if (collectionSeen) {
        kdLogFormatMessage("Several <%s> tags", element->Value());
        return false;
    }
    collectionSeen = true;
    return true;
}

bool SingleTagCollectionHelper::onCollectionTagNotFound() {
    return optional;
}

}  // namespace Util
