#pragma once

#include <boost/shared_ptr.hpp>
#include <string>
#include <vector>

namespace Statistics {

// One element of the upload document. Subclasses give the name, the attribute
// text and the content text; the tree is built and written on the collector's
// thread.
class NetworkCollectorNode {
public:
    virtual ~NetworkCollectorNode() {}

    virtual void appendNodeName(std::string& out) const = 0;
    virtual void appendNodeTagText(std::string& out) const = 0;
    virtual void appendContentText(std::string& out) const = 0;

    // The element and its subtree on one line: "<name attributes>", the
    // children, the content, "</name>". The space after the name is written
    // even without attributes, and elements are never self-closed, because
    // the receiving server has always read exactly this form.
    void appendContent(std::string& out) const;

    void addChild(const boost::shared_ptr<NetworkCollectorNode>& child) { children.push_back(child); }
    const std::vector<boost::shared_ptr<NetworkCollectorNode> >& getChildren() const { return children; }
    void removeChildren() { children.clear(); }

    // The text with '&', '<', '>' and '"' replaced by entities, so that any
    // value a device reports (a model name with a quote, a path with "&")
    // keeps the document well-formed. Text is taken as UTF-8; every non-ASCII
    // character becomes a character reference, because the document declares
    // windows-1251 and raw UTF-8 bytes are not valid there. Bytes that are no
    // character, and control characters XML forbids, become U+FFFD.
    static std::string escape(const std::string& text);

private:
    // Writes the character starting at text[start]; gives the bytes used.
    static std::size_t appendCharacterReference(const std::string& text, std::size_t start, std::string& out);

    std::vector<boost::shared_ptr<NetworkCollectorNode> > children;
};

}  // namespace Statistics
