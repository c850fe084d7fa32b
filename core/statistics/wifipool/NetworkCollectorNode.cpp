#include "statistics/wifipool/NetworkCollectorNode.h"

#include <cstdio>

namespace Statistics {

namespace {

// Stands for bytes that are no character.
const char* const kReplacement = "&#xFFFD;";

}  // namespace

void NetworkCollectorNode::appendContent(std::string& out) const {
    out += '<';
    appendNodeName(out);
    out += ' ';
    appendNodeTagText(out);
    out += '>';
    for (const boost::shared_ptr<NetworkCollectorNode>& child : children) {
        child->appendContent(out);
    }
    appendContentText(out);
    out += "</";
    appendNodeName(out);
    out += '>';
}

std::string NetworkCollectorNode::escape(const std::string& text) {
    std::string escaped;
    escaped.reserve(text.size());
    std::size_t i = 0;
    while (i < text.size()) {
        unsigned char c = static_cast<unsigned char>(text[i]);
        if (c >= 0x80) {
            i += appendCharacterReference(text, i, escaped);
            continue;
        }
        ++i;
        switch (c) {
            case '&':
                escaped += "&amp;";
                break;
            case '<':
                escaped += "&lt;";
                break;
            case '>':
                escaped += "&gt;";
                break;
            case '"':
                escaped += "&quot;";
                break;
            case '\t':
            case '\n':
            case '\r':
                escaped += static_cast<char>(c);
                break;
            default:
                // Other control characters are not allowed in XML at all.
                if (c < 0x20) {
                    escaped += kReplacement;
                } else {
                    escaped += static_cast<char>(c);
                }
        }
    }
    return escaped;
}

std::size_t NetworkCollectorNode::appendCharacterReference(const std::string& text, std::size_t start,
                                                           std::string& out) {
    unsigned char lead = static_cast<unsigned char>(text[start]);
    std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : lead >= 0xC0 ? 2 : 1;
    unsigned int codePoint = length == 4 ? lead & 0x07u : length == 3 ? lead & 0x0Fu : lead & 0x1Fu;
    bool valid = length > 1 && lead < 0xF5 && start + length <= text.size();
    for (std::size_t k = 1; valid && k < length; ++k) {
        unsigned char next = static_cast<unsigned char>(text[start + k]);
        valid = (next & 0xC0u) == 0x80u;
        codePoint = (codePoint << 6) | (next & 0x3Fu);
    }
    // Overlong forms and surrogates are not characters.
    static const unsigned int kSmallest[] = {0, 0, 0x80, 0x800, 0x10000};
    valid = valid && codePoint >= kSmallest[length] && codePoint <= 0x10FFFF &&
            (codePoint < 0xD800 || codePoint > 0xDFFF);
    if (!valid) {
        out += kReplacement;
        return 1;
    }
    char reference[16];
    std::snprintf(reference, sizeof(reference), "&#x%X;", codePoint);
    out += reference;
    return length;
}

}  // namespace Statistics
