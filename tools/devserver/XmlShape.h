#pragma once

#include <cstddef>
#include <string>

namespace DevServer {

// A strict, non-recursive look at the markup of an untrusted XML text before
// TinyXML parses it. TinyXML parses nested elements recursively, so a small
// gzip bomb of "<a><a><a>..." would exhaust a server thread's stack. This
// walks the same markup as TinyXML (comments, CDATA, processing instructions,
// start tags with quoted attribute values, end tags) with an explicit stack
// and refuses anything else, such as a DOCTYPE, where the two could disagree
// on where markup ends. Text it accepts nests no deeper than maxDepth in
// TinyXML either, when TinyXML reads it one byte per character
// (TIXML_ENCODING_LEGACY): in its UTF-8 mode TinyXML steps over a lead byte's
// whole sequence, '<' and quotes included. Any thread.
class XmlShape {
public:
    static bool check(const std::string& text, std::size_t maxDepth, std::string& error);
};

}  // namespace DevServer
