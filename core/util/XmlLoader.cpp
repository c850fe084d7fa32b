#include "util/XmlLoader.h"

#include <tinyxml.h>

#include <cstring>
#include <vector>

#include "io/BoundedReader.h"
#include "util/impl/XmlPrescan.h"

namespace Util {

namespace {

// TinyXML steps over a multi-byte UTF-8 sequence by its announced length even when the text
// ends inside it, landing up to three bytes past the terminator before it looks again. The
// zero padding keeps every such step inside the buffer and ends the parse there.
const std::size_t kTerminatorPadding = 8;

bool startsWith(const char* text, const char* prefix) {
    return std::strncmp(text, prefix, std::strlen(prefix)) == 0;
}

bool isSpace(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

const char* skipSpace(const char* p) {
    while (isSpace(*p)) {
        ++p;
    }
    return p;
}

bool equalsIgnoringCase(const std::string& text, const char* lowerCaseWord) {
    if (text.size() != std::strlen(lowerCaseWord)) {
        return false;
    }
    for (std::size_t i = 0; i < text.size(); ++i) {
        char c = text[i];
        if (c >= 'A' && c <= 'Z') {
            c = static_cast<char>(c - 'A' + 'a');
        }
        if (c != lowerCaseWord[i]) {
            return false;
        }
    }
    return true;
}

bool isDeclarationStart(const char* p) {
    return p[0] == '<' && p[1] == '?' && (p[2] == 'x' || p[2] == 'X') && (p[3] == 'm' || p[3] == 'M') &&
           (p[4] == 'l' || p[4] == 'L');
}

// The encoding named by the declaration opening at p; empty when it names none.
std::string declaredEncoding(const char* p) {
    const char* end = std::strchr(p, '>');
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

bool readsAsUtf8(const char* text) {
    if (startsWith(text, "\xEF\xBB\xBF")) {
        return true;
    }
    const char* p = skipSpace(text);
    if (!isDeclarationStart(p)) {
        return false;
    }
    const std::string encoding = declaredEncoding(p);
    return encoding.empty() || equalsIgnoringCase(encoding, "utf-8") || equalsIgnoringCase(encoding, "utf8");
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
// character and "/a>", so the markup after a bad lead byte would vanish from its reading but not
// from the prescan's. Every byte that is not part of a well-formed sequence becomes '?', which
// both readings agree on.
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

bool tooLarge(const XmlLimits& limits, TiXmlDocument& doc, std::string& error) {
    error = "document larger than " + std::to_string(limits.maxBytes) + " bytes";
    doc.SetError(TiXmlBase::TIXML_ERROR, nullptr, nullptr, TIXML_ENCODING_UNKNOWN);
    return false;
}

// text holds the document followed by at least kTerminatorPadding zero bytes.
bool parsePadded(std::vector<char>& text, const XmlLimits& limits, TiXmlDocument& doc, std::string& error) {
    const bool utf8 = readsAsUtf8(text.data());
    if (utf8) {
        replaceMalformedUtf8(text.data());
    }
    const TiXmlEncoding encoding = utf8 ? TIXML_ENCODING_UTF8 : TIXML_ENCODING_LEGACY;
    int errorId = TiXmlBase::TIXML_NO_ERROR;
    if (!XmlPrescan::check(text.data(), limits, error, errorId)) {
        // Callers that report the parser's error number (the positioning answer) keep one.
        doc.SetError(errorId, nullptr, nullptr, encoding);
        return false;
    }
    doc.Parse(text.data(), nullptr, encoding);
    if (doc.Error()) {
        error = std::string("not well-formed XML: ") + doc.ErrorDesc() + " at line " +
                std::to_string(doc.ErrorRow()) + ", column " + std::to_string(doc.ErrorCol());
        return false;
    }
    return true;
}

}  // namespace

bool XmlLoader::parse(const char* data, std::size_t size, const XmlLimits& limits, TiXmlDocument& doc,
                      std::string& error) {
    doc.Clear();
    doc.ClearError();
    if (size > limits.maxBytes) {
        return tooLarge(limits, doc, error);
    }
    std::vector<char> text(size + kTerminatorPadding, '\0');
    if (size > 0) {
        std::memcpy(text.data(), data, size);
    }
    return parsePadded(text, limits, doc, error);
}

bool XmlLoader::load(IO::InputStream& stream, const XmlLimits& limits, TiXmlDocument& doc,
                     std::string& error) {
    doc.Clear();
    doc.ClearError();
    std::vector<char> text;
    if (IO::BoundedReader::readAll(stream, limits.maxBytes, text) == IO::BoundedReader::TooLong) {
        return tooLarge(limits, doc, error);
    }
    text.resize(text.size() + kTerminatorPadding, '\0');
    return parsePadded(text, limits, doc, error);
}

}  // namespace Util
