#include "util/impl/XmlPrescan.h"

#include <tinyxml.h>

#include <cstring>
#include <vector>

namespace Util {

namespace {

bool isBlank(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

// TinyXML's letters: ASCII letters, '_' and every byte from 127 up.
bool startsName(char c) {
    const unsigned char byte = static_cast<unsigned char>(c);
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || byte == '_' || byte >= 127;
}

bool continuesName(char c) {
    return startsName(c) || (c >= '0' && c <= '9') || c == '-' || c == '.' || c == ':';
}

// A byte a quoted value of a processing instruction may hold: TinyXML reads the quotes of
// some declaration attributes and steps over the others word by word, so a value that holds
// no space, quote or angle bracket is where both readings meet again at the same '>'.
bool isPlainValueByte(char c) {
    const unsigned char byte = static_cast<unsigned char>(c);
    return byte > ' ' && byte < 127 && c != '"' && c != '\'' && c != '<' && c != '>';
}

struct Name {
    const char* start;
    std::size_t length;
};

class Walker {
public:
    Walker(const char* text, const XmlLimits& limits, std::string& error, int& errorId)
        : p(text), limits(limits), error(error), errorId(errorId), nodes(0), sawElement(false) {}

    bool run() {
        skipByteOrderMark();
        while (*p != '\0') {
            if (*p == '<') {
                if (!markup()) {
                    return false;
                }
            } else if (!open.empty()) {
                if (!text()) {
                    return false;
                }
            } else if (isBlank(*p)) {
                ++p;
            } else {
                return fail("text outside the root element", sawElement
                                                                 ? TiXmlBase::TIXML_ERROR_DOCUMENT_TOP_ONLY
                                                                 : TiXmlBase::TIXML_ERROR_DOCUMENT_EMPTY);
            }
        }
        if (!open.empty()) {
            return fail("element <" + nameText(open.back()) + "> is never closed",
                        TiXmlBase::TIXML_ERROR_READING_END_TAG);
        }
        return sawElement || fail("no element", TiXmlBase::TIXML_ERROR_DOCUMENT_EMPTY);
    }

private:
    void skipByteOrderMark() {
        if (std::strncmp(p, "\xEF\xBB\xBF", 3) == 0) {
            p += 3;
        }
    }

    bool markup() {
        if (starts("<!--")) {
            return skipPast(4, "-->", "comment", TiXmlBase::TIXML_ERROR_PARSING_COMMENT) && addNode();
        }
        if (starts("<![CDATA[")) {
            return skipPast(9, "]]>", "CDATA section", TiXmlBase::TIXML_ERROR_PARSING_CDATA) && addNode();
        }
        if (starts("<?")) {
            return instruction() && addNode();
        }
        if (starts("<!")) {
            return skipPast(2, ">", "declaration", TiXmlBase::TIXML_ERROR_PARSING_UNKNOWN) && addNode();
        }
        if (starts("</")) {
            return endTag();
        }
        return startTag();
    }

    bool text() {
        const char* next = std::strchr(p, '<');
        p = next ? next : p + std::strlen(p);
        return addNode();
    }

    bool startTag() {
        ++p;
        const Name name = readName();
        if (name.length == 0) {
            return fail("'<' not followed by an element name", TiXmlBase::TIXML_ERROR_PARSING_UNKNOWN);
        }
        if (*p == '\0') {
            return fail("the text ends in the name <" + nameText(name),
                        TiXmlBase::TIXML_ERROR_FAILED_TO_READ_ELEMENT_NAME);
        }
        int attributes = 0;
        for (;;) {
            skipBlanks();
            if (*p == '>') {
                ++p;
                return openElement(name);
            }
            if (starts("/>")) {
                p += 2;
                sawElement = true;
                return addNode();
            }
            if (!attribute()) {
                return false;
            }
            if (++attributes > limits.maxAttributesPerElement) {
                return overLimit("element <" + nameText(name) + "> has more than " +
                                 std::to_string(limits.maxAttributesPerElement) + " attributes");
            }
        }
    }

    bool openElement(const Name& name) {
        if (static_cast<int>(open.size()) >= limits.maxDepth) {
            return overLimit("elements nested deeper than " + std::to_string(limits.maxDepth) + " levels");
        }
        open.push_back(name);
        sawElement = true;
        return addNode();
    }

    bool attribute() {
        if (readName().length == 0) {
            return *p == '/' ? fail("'/' not followed by '>'", TiXmlBase::TIXML_ERROR_PARSING_EMPTY)
                             : fail("malformed attribute", TiXmlBase::TIXML_ERROR_READING_ATTRIBUTES);
        }
        skipBlanks();
        if (*p != '=') {
            return fail("attribute without '='", TiXmlBase::TIXML_ERROR_READING_ATTRIBUTES);
        }
        ++p;
        skipBlanks();
        if (*p != '"' && *p != '\'') {
            return fail("attribute value not in quotes", TiXmlBase::TIXML_ERROR_READING_ATTRIBUTES);
        }
        const char* close = std::strchr(p + 1, *p);
        if (!close) {
            return fail("attribute value never ends", TiXmlBase::TIXML_ERROR_PARSING_ELEMENT);
        }
        p = close + 1;
        if (*p == '\0') {
            return fail("the text ends in a start tag", TiXmlBase::TIXML_ERROR_PARSING_ELEMENT);
        }
        return addNode();
    }

    bool endTag() {
        p += 2;
        const Name name = readName();
        skipBlanks();
        if (*p != '>') {
            return fail("malformed end tag", TiXmlBase::TIXML_ERROR_READING_END_TAG);
        }
        ++p;
        if (open.empty()) {
            return fail("end tag </" + nameText(name) + "> without a start tag",
                        TiXmlBase::TIXML_ERROR_PARSING_UNKNOWN);
        }
        const Name& expected = open.back();
        if (expected.length != name.length || std::memcmp(expected.start, name.start, name.length) != 0) {
            return fail("end tag </" + nameText(name) + "> does not close <" + nameText(expected) + ">",
                        TiXmlBase::TIXML_ERROR_READING_END_TAG);
        }
        open.pop_back();
        return true;
    }

    bool instruction() {
        char quote = '\0';
        for (const char* q = p + 2; *q != '\0'; ++q) {
            if (quote != '\0') {
                if (*q == quote) {
                    quote = '\0';
                } else if (!isPlainValueByte(*q)) {
                    return fail("processing instruction with a quoted value of spaces, quotes or brackets",
                                TiXmlBase::TIXML_ERROR_PARSING_DECLARATION);
                }
            } else if (*q == '"' || *q == '\'') {
                quote = *q;
            } else if (*q == '>') {
                p = q + 1;
                return true;
            }
        }
        return fail("processing instruction never ends", TiXmlBase::TIXML_ERROR_PARSING_DECLARATION);
    }

    Name readName() {
        const char* start = p;
        if (startsName(*p)) {
            while (continuesName(*p)) {
                ++p;
            }
        }
        return Name{start, static_cast<std::size_t>(p - start)};
    }

    void skipBlanks() {
        while (isBlank(*p)) {
            ++p;
        }
    }

    bool skipPast(std::size_t opening, const char* marker, const char* what, int unendedError) {
        const char* found = std::strstr(p + opening, marker);
        if (!found) {
            return fail(std::string(what) + " never ends", unendedError);
        }
        p = found + std::strlen(marker);
        return true;
    }

    bool addNode() {
        if (++nodes > limits.maxNodes) {
            return overLimit("more than " + std::to_string(limits.maxNodes) + " nodes");
        }
        return true;
    }

    bool starts(const char* prefix) const { return std::strncmp(p, prefix, std::strlen(prefix)) == 0; }

    static std::string nameText(const Name& name) { return std::string(name.start, name.length); }

    bool fail(const std::string& reason, int tinyXmlError) {
        error = "not well-formed XML: " + reason;
        errorId = tinyXmlError;
        return false;
    }

    // The text may be well-formed; TinyXML's generic error stands for the refusal.
    bool overLimit(const std::string& reason) {
        error = reason;
        errorId = TiXmlBase::TIXML_ERROR;
        return false;
    }

    const char* p;
    const XmlLimits& limits;
    std::string& error;
    int& errorId;
    std::size_t nodes;
    bool sawElement;
    std::vector<Name> open;
};

}  // namespace

bool XmlPrescan::check(const char* text, const XmlLimits& limits, std::string& error, int& errorId) {
    return Walker(text, limits, error, errorId).run();
}

}  // namespace Util
