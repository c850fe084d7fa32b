#include "devserver/XmlShape.h"

#include <vector>

namespace DevServer {

namespace {

bool isBlank(char c) {
    return c == ' ' || c == '\t' || c == '\r' || c == '\n';
}

bool endsName(char c) {
    return isBlank(c) || c == '/' || c == '>' || c == '=' || c == '<' || c == '"' || c == '\'';
}

// Walks one text; each method advances pos and returns false with error set
// when the markup is outside what both walkers read alike.
class Walker {
public:
    Walker(const std::string& text, std::size_t maxDepth, std::string& error)
        : text(text), maxDepth(maxDepth), error(error), pos(0) {}

    bool run() {
        while ((pos = text.find('<', pos)) != std::string::npos) {
            if (!markup()) {
                return false;
            }
        }
        if (!open.empty()) {
            return fail("element <" + open.back() + "> is never closed");
        }
        return true;
    }

private:
    bool markup() {
        if (starts("<!--")) {
            return skipPast("-->", "comment");
        }
        if (starts("<![CDATA[")) {
            return skipPast("]]>", "CDATA section");
        }
        if (starts("<?")) {
            // TinyXML ends some processing instructions at their first '>'.
            const std::size_t close = text.find('>', pos);
            if (close == std::string::npos || text[close - 1] != '?' || close < pos + 3) {
                return fail("processing instruction not closed by \"?>\"");
            }
            pos = close + 1;
            return true;
        }
        if (starts("<!")) {
            return fail("declarations such as DOCTYPE are not accepted");
        }
        if (starts("</")) {
            return endTag();
        }
        return startTag();
    }

    bool startTag() {
        ++pos;
        const std::string name = readName();
        if (name.empty()) {
            return fail("'<' not followed by an element name");
        }
        for (;;) {
            skipBlanks();
            if (pos >= text.size()) {
                return fail("start tag <" + name + " never ends");
            }
            if (text[pos] == '>') {
                ++pos;
                if (open.size() >= maxDepth) {
                    return fail("elements nest deeper than " + std::to_string(maxDepth));
                }
                open.push_back(name);
                return true;
            }
            if (starts("/>")) {
                pos += 2;
                return true;
            }
            if (!attribute()) {
                return false;
            }
        }
    }

    bool attribute() {
        if (readName().empty()) {
            return fail("malformed attribute");
        }
        skipBlanks();
        if (pos >= text.size() || text[pos] != '=') {
            return fail("attribute without '='");
        }
        ++pos;
        skipBlanks();
        if (pos >= text.size() || (text[pos] != '"' && text[pos] != '\'')) {
            return fail("attribute value not in quotes");
        }
        const std::size_t close = text.find(text[pos], pos + 1);
        if (close == std::string::npos) {
            return fail("attribute value never ends");
        }
        pos = close + 1;
        return true;
    }

    bool endTag() {
        pos += 2;
        const std::string name = readName();
        skipBlanks();
        if (pos >= text.size() || text[pos] != '>') {
            return fail("malformed end tag");
        }
        ++pos;
        if (open.empty() || open.back() != name) {
            return fail("end tag </" + name + "> does not match");
        }
        open.pop_back();
        return true;
    }

    std::string readName() {
        const std::size_t start = pos;
        while (pos < text.size() && !endsName(text[pos])) {
            ++pos;
        }
        return text.substr(start, pos - start);
    }

    void skipBlanks() {
        while (pos < text.size() && isBlank(text[pos])) {
            ++pos;
        }
    }

    bool skipPast(const char* marker, const char* what) {
        const std::size_t found = text.find(marker, pos);
        if (found == std::string::npos) {
            return fail(std::string(what) + " never ends");
        }
        pos = found + std::char_traits<char>::length(marker);
        return true;
    }

    bool starts(const char* prefix) const {
        return text.compare(pos, std::char_traits<char>::length(prefix), prefix) == 0;
    }

    bool fail(const std::string& what) {
        error = what;
        return false;
    }

    const std::string& text;
    const std::size_t maxDepth;
    std::string& error;
    std::size_t pos;
    std::vector<std::string> open;
};

}  // namespace

bool XmlShape::check(const std::string& text, std::size_t maxDepth, std::string& error) {
    return Walker(text, maxDepth, error).run();
}

}  // namespace DevServer
