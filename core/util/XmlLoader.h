#pragma once

#include <cstddef>
#include <string>

#include "util/XmlLimits.h"

class TiXmlDocument;

namespace IO {
class InputStream;
}

namespace Util {

// The one way untrusted XML text reaches TinyXML. It decides the encoding as TinyXML would
// (UTF-8 after a byte order mark or under a declaration naming UTF-8 or none, one byte a
// character otherwise) and tells the parser, turns malformed UTF-8 into '?', pads the text so
// that no step of the parser leaves the buffer, and refuses before parsing what would cost more
// than the limits allow (XmlPrescan). The text ends at its first zero byte, as for TinyXML.
// Any thread, on documents it owns.
class XmlLoader {
public:
    // False with a reason in error when the text is refused or is not well-formed; the
    // document's previous content is dropped either way, and a refused document reports an error
    // (ErrorId()) as TinyXML would for the same fault, TIXML_ERROR for a limit.
    static bool parse(const char* data, std::size_t size, const XmlLimits& limits, TiXmlDocument& doc,
                      std::string& error);
    // Reads what the stream has left, growing with what arrives; a stream longer than
    // limits.maxBytes is refused without reading further.
    static bool load(IO::InputStream& stream, const XmlLimits& limits, TiXmlDocument& doc,
                     std::string& error);
};

}  // namespace Util
