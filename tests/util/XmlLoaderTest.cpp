#include <gtest/gtest.h>
#include <tinyxml.h>

#include <algorithm>
#include <string>
#include <vector>

#include "io/InputStream.h"
#include "util/XmlLimits.h"
#include "util/XmlLoader.h"

using Util::XmlLimits;
using Util::XmlLoader;

namespace {

std::string repeat(const std::string& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

std::string attributes(int count) {
    std::string all;
    for (int i = 0; i < count; ++i) {
        all += " a" + std::to_string(i) + "=\"" + std::to_string(i) + "\"";
    }
    return all;
}

XmlLimits small() {
    return XmlLimits{4096, 4, 3, 20};
}

// A stream that claims far more than it holds, as a zip entry with a lying header or a split
// package's parts do; it remembers the largest read asked of it.
class ClaimingStream : public IO::InputStream {
public:
    ClaimingStream(const std::string& content, long long claimed) : content(content), claimed(claimed) {}

    long long available() override { return claimed - position; }
    int read(void* buffer, int length) override {
        largestRequest = std::max(largestRequest, length);
        const int left = static_cast<int>(content.size()) - static_cast<int>(position);
        const int count = std::max(0, std::min(left, length));
        content.copy(static_cast<char*>(buffer), count, position);
        position += count;
        return count;
    }
    long long tell() override { return position; }
    void seek(long long, KDfileSeekOrigin) override {}

    int largestRequest = 0;

private:
    std::string content;
    long long claimed;
    std::size_t position = 0;
};

bool parse(const std::string& text, const XmlLimits& limits, TiXmlDocument& doc, std::string& error) {
    return XmlLoader::parse(text.data(), text.size(), limits, doc, error);
}

}  // namespace

TEST(XmlLoaderTest, EachLimitRefusesTheDocumentThatPassesIt) {
    const struct {
        std::string text;
        const char* reason;
    } refused[] = {
        {repeat("<a>", 5) + repeat("</a>", 5), "elements nested deeper than 4 levels"},
        {"<a" + attributes(4) + "/>", "element <a> has more than 3 attributes"},
        {"<r>" + repeat("<b/>", 20) + "</r>", "more than 20 nodes"},
        {"<r>" + std::string(4096, ' ') + "</r>", "document larger than 4096 bytes"},
    };
    for (const auto& c : refused) {
        TiXmlDocument doc;
        std::string error;
        EXPECT_FALSE(parse(c.text, small(), doc, error)) << c.text.substr(0, 60);
        EXPECT_EQ(c.reason, error);
        EXPECT_EQ(nullptr, doc.RootElement());
        EXPECT_EQ(TiXmlBase::TIXML_ERROR, doc.ErrorId());
    }
    const std::string atTheLimits[] = {
        repeat("<a>", 4) + repeat("</a>", 4),
        "<a" + attributes(3) + "/><!-- one more node -->",
        "<r>" + repeat("<b/>", 18) + "</r>",
        "<r>" + std::string(4089, ' ') + "</r>",
    };
    for (const std::string& text : atTheLimits) {
        TiXmlDocument doc;
        std::string error;
        EXPECT_TRUE(parse(text, small(), doc, error)) << text.substr(0, 60) << ": " << error;
    }
}

// The 40,000 attributes would cost TinyXML's pairwise duplicate check some 16 s; the stray end
// tags before the root are nodes of their own to TinyXML, and the 200,000 open elements after
// them overflowed its recursion.
TEST(XmlLoaderTest, HostileDocumentsAreRefusedBeforeTheParserSeesThem) {
    const struct {
        std::string text;
        const char* reason;
    } refused[] = {
        {"<r" + attributes(40000) + "/>", "element <r> has more than 32 attributes"},
        {repeat("</x>", 200000) + repeat("<a>", 200000),
         "not well-formed XML: end tag </x> without a start tag"},
        {repeat("<a>", 200000), "elements nested deeper than 256 levels"},
        {"<r>" + repeat("<b/>", 200001) + "</r>", "more than 200000 nodes"},
    };
    for (const auto& c : refused) {
        TiXmlDocument doc;
        std::string error;
        EXPECT_FALSE(parse(c.text, XmlLimits::forAnswers(), doc, error)) << c.text.substr(0, 60);
        EXPECT_EQ(c.reason, error);
    }
}

// Markup the walk could read otherwise than TinyXML does is refused, so that nothing the walk
// counted less can reach the parser.
TEST(XmlLoaderTest, MarkupReadAmbiguouslyIsRefusedAndPlainMarkupIsRead) {
    const struct {
        std::string text;
        const char* reason;
    } refused[] = {
        {"", "no element"},
        {"<a/>trailing", "text outside the root element"},
        {"<a x=1/>", "attribute value not in quotes"},
        {"<a x='1/>", "attribute value never ends"},
        {"<a></b>", "end tag </b> does not close <a>"},
        {"<a><b>", "element <b> is never closed"},
        {"< a/>", "'<' not followed by an element name"},
        {"<?xml version=\"1 0\"?><a/>", "processing instruction with a quoted value"},
        {"<?xml foo='a version=\"b'?><a/>", "processing instruction with a quoted value"},
        {"<a><!-- never closed </a>", "comment never ends"},
    };
    for (const auto& c : refused) {
        TiXmlDocument doc;
        std::string error;
        EXPECT_FALSE(parse(c.text, XmlLimits::forAnswers(), doc, error)) << c.text;
        EXPECT_NE(std::string::npos, error.find(c.reason)) << c.text << ": " << error;
    }

    TiXmlDocument doc;
    std::string error;
    const std::string plain =
        "\xEF\xBB\xBF<?xml version='1.0' encoding=\"UTF-8\"?>\n<!DOCTYPE r>\n<?pi data?>"
        "<r a = 'x>y' b=\"</r>\"><![CDATA[<c>]]><!-- <d> --><e/>t &amp; u</r>\n";
    ASSERT_TRUE(parse(plain, XmlLimits::forAnswers(), doc, error)) << error;
    const TiXmlElement* root = doc.RootElement();
    EXPECT_STREQ("x>y", root->Attribute("a"));
    EXPECT_STREQ("</r>", root->Attribute("b"));
    EXPECT_NE(nullptr, root->FirstChildElement("e"));
    EXPECT_EQ(nullptr, root->FirstChildElement("c"));
}

// A lead byte at the very end announces bytes the text does not have; TinyXML steps over them
// past the terminator unless the text is padded (an over-read that ASan and valgrind see).
TEST(XmlLoaderTest, TextEndingInsideAUtf8SequenceFailsCleanly) {
    const std::string declaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";
    for (const std::string& text :
         {declaration + "<x a=\"\xF0", declaration + "<x>\xF0", std::string("\xEF\xBB\xBF<x>\xE2\x82")}) {
        std::vector<char> exact(text.begin(), text.end());
        TiXmlDocument doc;
        std::string error;
        EXPECT_FALSE(XmlLoader::parse(exact.data(), exact.size(), XmlLimits::forAnswers(), doc, error));
        EXPECT_NE(std::string::npos, error.find("not well-formed XML")) << error;
    }
}

TEST(XmlLoaderTest, StreamsAreReadAsTheyDeliverNotAsTheyClaim) {
    const std::string text = "<r><a>1</a></r>";
    ClaimingStream honestEnough(text, 2200680000LL);
    TiXmlDocument doc;
    std::string error;
    ASSERT_TRUE(XmlLoader::load(honestEnough, XmlLimits::forAnswers(), doc, error)) << error;
    EXPECT_STREQ("1", doc.RootElement()->FirstChildElement("a")->GetText());
    EXPECT_LE(honestEnough.largestRequest, 64 * 1024);

    ClaimingStream tooLong("<r>" + std::string(5000, ' ') + "</r>", 5007);
    EXPECT_FALSE(XmlLoader::load(tooLong, small(), doc, error));
    EXPECT_EQ("document larger than 4096 bytes", error);
    EXPECT_LE(tooLong.tell(), 4097);

    // A length field of 128 MiB that available() confirms, over three bytes of data.
    std::string out = "kept";
    ClaimingStream claimedString(std::string("\x00\x00\x00\x08", 4) + "abc", 4 + 0x08000000LL);
    EXPECT_FALSE(claimedString.readString(out));
    EXPECT_EQ("", out);
    EXPECT_LE(claimedString.largestRequest, 64 * 1024);
}
