#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

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
    for (char c : text) {
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
            default:
                escaped += c;
        }
    }
    return escaped;
}

}  // namespace Statistics
