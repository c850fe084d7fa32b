#pragma once

#include <string>

#include "util/XmlLimits.h"

namespace Util {

// A non-recursive walk over XML text, run before TinyXML parses it, that bounds nesting depth,
// attributes per element and nodes. It accepts only markup whose reading it shares with TinyXML
// whatever TinyXML's quirks (quoted values, end tags, comments, CDATA, processing instructions
// whose quoted values hold no space or angle bracket) and refuses the rest, including text
// outside the root element and end tags without a start tag, which TinyXML would keep as nodes
// of their own. Multi-byte UTF-8 must be well-formed before the walk (XmlLoader repairs it), so
// that TinyXML never steps over a byte of markup. Any thread.
class XmlPrescan {
public:
    // text is zero-terminated and ends there, as for TinyXML. False with the reason in error and
    // in errorId the TinyXML error number that TinyXML gives the same fault where it reads the
    // fault alike (TIXML_ERROR for a limit).
    static bool check(const char* text, const XmlLimits& limits, std::string& error, int& errorId);
};

}  // namespace Util
