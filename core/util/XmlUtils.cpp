#include "util/XmlUtils.h"

#include <KD/kd.h>
#include <tinyxml.h>

#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>

#include "io/ByteArrayInputStream.h"
#include "io/zip/GzipInputStream.h"
#include "util/Logger.h"
#include "util/TagCollectionHandler.h"

namespace Util {

namespace {

bool equalsIgnoringCase(const char* text, const char* lowerCaseWord) {
    for (; *text != '\0' && *lowerCaseWord != '\0'; ++text, ++lowerCaseWord) {
        char c = *text;
        if (c >= 'A' && c <= 'Z') {
            c = static_cast<char>(c - 'A' + 'a');
        }
        if (c != *lowerCaseWord) {
            return false;
        }
    }
    return *text == '\0' && *lowerCaseWord == '\0';
}

const char* textOf(const TiXmlElement* element) {
    return element ? element->GetText() : nullptr;
}

const TiXmlElement* childOf(const TiXmlElement* element, const char* name) {
    return element ? element->FirstChildElement(name) : nullptr;
}

bool startsWith(const char* text, const char* prefix) {
    return std::strncmp(text, prefix, std::strlen(prefix)) == 0;
}

bool isSpace(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

// TinyXML takes any byte from 127 up for a letter, so such a byte starts an element too.
bool startsName(char c) {
    unsigned char byte = static_cast<unsigned char>(c);
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || byte == '_' || byte >= 127;
}

bool isNameChar(char c) {
    return startsName(c) || (c >= '0' && c <= '9') || c == '-' || c == '.' || c == ':';
}

const char* skipSpace(const char* p) {
    while (isSpace(*p)) {
        ++p;
    }
    return p;
}

// The end ('>') of an XML declaration whose body (after "<?xml") is plain name="value" pairs,
// values without spaces or quotes; null for anything else. TinyXML honours the quotes of some
// declaration attributes and not of others, so only where both readings meet at the same '>' do
// we know where it resumes.
const char* plainDeclarationEnd(const char* p) {
    for (;;) {
        const char* name = skipSpace(p);
        if (*name == '?' || *name == '>') {
            p = *name == '?' ? name + 1 : name;
            return *p == '>' ? p : nullptr;
        }
        if (name == p || !startsName(*name)) {
            return nullptr;
        }
        while (isNameChar(*name)) {
            ++name;
        }
        const char* value = skipSpace(name);
        if (*value != '=') {
            return nullptr;
        }
        value = skipSpace(value + 1);
        const char quote = *value;
        if (quote != '"' && quote != '\'') {
            return nullptr;
        }
        for (++value; *value != quote; ++value) {
            if (*value == '\0' || *value == '"' || *value == '\'' || *value == '<' || *value == '>' ||
                isSpace(*value)) {
                return nullptr;
            }
        }
        p = value + 1;
    }
}

// The '>' that ends the element tag opening at p, stepping over quoted attribute values as
// TinyXML does; null when the text ends first.
const char* elementTagEnd(const char* p) {
    while (*p != '\0' && *p != '>') {
        if (*p != '=') {
            ++p;
            continue;
        }
        p = skipSpace(p + 1);
        if (*p == '"' || *p == '\'') {
            p = std::strchr(p + 1, *p);
            if (!p) {
                return nullptr;
            }
            ++p;
        }
    }
    return *p == '>' ? p : nullptr;
}

bool isDeclarationStart(const char* p) {
    if (!startsWith(p, "<?")) {
        return false;
    }
    for (int i = 0; i < 3; ++i) {
        char c = p[2 + i];
        if (c >= 'A' && c <= 'Z') {
            c = static_cast<char>(c - 'A' + 'a');
        }
        if (c != "xml"[i]) {
            return false;
        }
    }
    return true;
}

// Walks the text as TinyXML will and tells whether it nests deeper than maxDepth elements. TinyXML
// parses a level per stack frame, so this must run first. Where TinyXML would stop with an error
// the walk may stop as well; where its reading is unclear (an odd XML declaration) the document
// counts as too deep.
bool nestsDeeperThan(const char* text, int maxDepth) {
    int depth = 0;
    for (const char* p = std::strchr(text, '<'); p; p = std::strchr(p, '<')) {
        const char* end;
        if (startsWith(p, "<!--")) {
            end = std::strstr(p + 4, "-->");
            end = end ? end + 2 : nullptr;
        } else if (startsWith(p, "<![CDATA[")) {
            end = std::strstr(p + 9, "]]>");
            end = end ? end + 2 : nullptr;
        } else if (isDeclarationStart(p)) {
            end = plainDeclarationEnd(p + 5);
            if (!end) {
                return true;
            }
        } else if (p[1] == '/') {
            depth = depth > 0 ? depth - 1 : 0;
            end = std::strchr(p, '>');
        } else if (startsName(p[1])) {
            end = elementTagEnd(p + 1);
            if (end && end[-1] != '/' && ++depth > maxDepth) {
                return true;
            }
        } else {
            end = std::strchr(p, '>');
        }
        if (!end) {
            return false;
        }
        p = end + 1;
    }
    return false;
}

// The UTF-8 continuation bytes a lead byte announces; -1 for a byte that cannot start a sequence.
int continuationBytesOf(unsigned char lead) {
    if (lead < 0x80) {
        return 0;
    }
    if (lead >= 0xC0 && lead < 0xE0) {
        return 1;
    }
    if (lead >= 0xE0 && lead < 0xF0) {
        return 2;
    }
    if (lead >= 0xF0 && lead < 0xF8) {
        return 3;
    }
    return -1;
}

// TinyXML reading UTF-8 takes a lead byte's announced length on trust: "\xE0</a>" reads as one
// character and "/a>", so the markup after a bad lead byte vanishes and a hostile document
// nests as deep as it likes behind the depth check. Every byte that is not part of a
// well-formed sequence becomes '?', which both readings agree on.
void replaceMalformedUtf8(char* text) {
    unsigned char* p = reinterpret_cast<unsigned char*>(text);
    while (*p != '\0') {
        const int needed = continuationBytesOf(*p);
        int present = 0;
        while (present < needed && (p[1 + present] & 0xC0) == 0x80) {
            ++present;
        }
        if (needed < 0 || present < needed) {
            *p++ = '?';
        } else {
            p += 1 + needed;
        }
    }
}

// The encoding named by the declaration opening at p ("<?xml"); empty when it names none.
std::string declaredEncoding(const char* p) {
    const char* end = std::strstr(p, "?>");
    const char* name = std::strstr(p, "encoding");
    if (!name || (end && name > end)) {
        return std::string();
    }
    const char* value = skipSpace(name + std::strlen("encoding"));
    if (*value != '=') {
        return std::string();
    }
    value = skipSpace(value + 1);
    const char quote = *value;
    const char* close = quote == '"' || quote == '\'' ? std::strchr(value + 1, quote) : nullptr;
    return close ? std::string(value + 1, close) : std::string();
}

// Reads the text as UTF-8 after a byte order mark or under a declaration naming UTF-8 or no
// encoding, one byte a character otherwise: the choice TinyXML makes by itself, made here so
// that the text can be prepared for it and the parser told.
bool readsAsUtf8(const char* text) {
    if (startsWith(text, "\xEF\xBB\xBF")) {
        return true;
    }
    const char* p = skipSpace(text);
    if (!isDeclarationStart(p)) {
        return false;
    }
    const std::string encoding = declaredEncoding(p);
    return encoding.empty() || equalsIgnoringCase(encoding.c_str(), "utf-8") ||
           equalsIgnoringCase(encoding.c_str(), "utf8");
}

}  // namespace

bool XmlUtils::load(const std::vector<unsigned char>& bytes, bool gzipped, TiXmlDocument& doc) {
    if (bytes.size() > static_cast<size_t>(INT_MAX)) {
        doc.Clear();
        return false;
    }
    IO::ByteArrayInputStream plain(bytes.data(), static_cast<int>(bytes.size()));
    if (!gzipped) {
        return load(&plain, doc);
    }
    IO::Zip::GzipInputStream inflated(&plain);
    return load(&inflated, doc);
}

bool XmlUtils::load(IO::InputStream* stream, TiXmlDocument& doc) {
    KD_ASSERT(stream);
    doc.Clear();
    if (!stream) {
        return false;
    }
    // TinyXML steps over a multi-byte UTF-8 sequence by its announced length
    // even when the text ends inside it, so on broken input it may land up to
    // three bytes past the terminator before it looks again. The zero padding
    // keeps every such step inside the buffer and ends the parse there.
    const int kTerminatorPadding = 8;
    const long long left = stream->available();
    const int size = left <= 0 ? 0
                               : (left >= INT_MAX - kTerminatorPadding ? INT_MAX - kTerminatorPadding
                                                                       : static_cast<int>(left));
    std::vector<char> text(static_cast<size_t>(size) + kTerminatorPadding, '\0');
    const int got = size > 0 ? stream->read(text.data(), size) : 0;
    text[got > 0 ? got : 0] = '\0';
    const bool utf8 = readsAsUtf8(text.data());
    if (utf8) {
        replaceMalformedUtf8(text.data());
    }
    if (nestsDeeperThan(text.data(), kMaxDepth)) {
        Logger::log(Logger::Error, "XmlUtils::load()[document nested deeper than %d levels]", kMaxDepth);
        return false;
    }
    doc.Parse(text.data(), nullptr, utf8 ? TIXML_ENCODING_UTF8 : TIXML_ENCODING_LEGACY);
    return !doc.Error();
}

std::string XmlUtils::getText(const TiXmlElement* element, const std::string& defaultValue) {
    const char* text = textOf(element);
    return text ? std::string(text) : defaultValue;
}

int XmlUtils::getValueAsInt(const TiXmlElement* element) {
    const char* text = textOf(element);
    return text ? std::atoi(text) : 0;
}

float XmlUtils::getValueAsFloat(const TiXmlElement* element) {
    const char* text = textOf(element);
    return text ? static_cast<float>(std::strtod(text, nullptr)) : 0.0f;
}

bool XmlUtils::getChildValueAsInt(const TiXmlElement* element, const char* name, int& value) {
    const TiXmlElement* child = childOf(element, name);
    if (!child) {
        return false;
    }
    value = getValueAsInt(child);
    return true;
}

bool XmlUtils::getChildValueAsUInt(const TiXmlElement* element, const char* name, unsigned int& value) {
    const TiXmlElement* child = childOf(element, name);
    if (!child) {
        return false;
    }
    const char* text = textOf(child);
    const long long number = text ? std::strtoll(text, nullptr, 10) : 0;
    if (number < 0 || number > static_cast<long long>(UINT_MAX)) {
        return false;
    }
    value = static_cast<unsigned int>(number);
    return true;
}

bool XmlUtils::getChildValueAsString(const TiXmlElement* element, const char* name, std::string& value) {
    const TiXmlElement* child = childOf(element, name);
    if (!child) {
        return false;
    }
    value = getText(child, std::string());
    return true;
}

const char* XmlUtils::getStringAttr(const TiXmlElement* element, const char* name, const char* defaultValue) {
    const char* text = element ? element->Attribute(name) : nullptr;
    return text ? text : defaultValue;
}

int XmlUtils::getIntAttr(const TiXmlElement* element, const char* name, int defaultValue) {
    int value = defaultValue;
    if (!element || element->QueryIntAttribute(name, &value) != TIXML_SUCCESS) {
        return defaultValue;
    }
    return value;
}

float XmlUtils::getFloatAttr(const TiXmlElement* element, const char* name, float defaultValue) {
    float value = defaultValue;
    if (!element || element->QueryFloatAttribute(name, &value) != TIXML_SUCCESS) {
        return defaultValue;
    }
    return value;
}

bool XmlUtils::getBoolAttr(const TiXmlElement* element, const char* name) {
    const char* text = element ? element->Attribute(name) : nullptr;
    if (!text) {
        return false;
    }
    return kdStrcmp(text, "0") != 0 && !equalsIgnoringCase(text, "false");
}

bool XmlUtils::parseTagCollections(const char* collectionTag, const char* itemTag, const TiXmlElement* parent,
                                   TagCollectionHandler& handler) {
    KD_ASSERT(parent);
    if (!parent) {
        return false;
    }
    bool found = false;
    for (const TiXmlElement* collection = parent->FirstChildElement(collectionTag); collection;
         collection = collection->NextSiblingElement(collectionTag)) {
        found = true;
        if (!handler.onCollectionTag(collection)) {
            return false;
        }
        for (const TiXmlElement* item = collection->FirstChildElement(itemTag); item;
             item = item->NextSiblingElement(itemTag)) {
            if (!handler.onItemTag(item)) {
                return false;
            }
        }
    }
    return found || handler.onCollectionTagNotFound();
}

}  // namespace Util
