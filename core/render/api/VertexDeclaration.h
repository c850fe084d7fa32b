#pragma once

#include <string>
#include <vector>

#include "render/api/Types.h"

namespace Render {
namespace API {

// The layout of one vertex: each element names what it feeds (USAGE_*), its
// type and its byte offset; stride is the distance between vertices. Value
// type; any thread.
struct VertexDeclaration {
    static const char* const USAGE_POSITION;
    static const char* const USAGE_COLOR;
    static const char* const USAGE_TEXCOORD;

    struct Element {
        std::string usage;
        ElementType type;
        int offset;
    };

    int stride = 0;
    std::vector<Element> elements;
};

}  // namespace API
}  // namespace Render
