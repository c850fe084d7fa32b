#pragma once

#include <cstddef>

namespace Util {

// What one untrusted XML document may cost before TinyXML is let at it. TinyXML spends a stack
// frame per nesting level, compares each attribute with every earlier one of its element and
// allocates every node separately, so each of these bounds a resource that the text alone
// would otherwise choose.
struct XmlLimits {
    std::size_t maxBytes;
    int maxDepth;
    int maxAttributesPerElement;
    // Elements, attributes, texts, comments and other markup together.
    std::size_t maxNodes;

    // Server answers and other small documents: far beyond any we read, yet a hostile one costs
    // at most a few tens of megabytes.
    static XmlLimits forAnswers() { return XmlLimits{8u * 1024u * 1024u, 256, 32, 200000}; }
};

}  // namespace Util
