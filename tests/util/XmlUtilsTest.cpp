#include <tinyxml.h>

#include <string>
#include <vector>

#include "io/ByteArrayOutputStream.h"
#include "io/zip/GzipOutputStream.h"
#include "support/PalTest.h"
#include "support/ScopedLocale.h"
#include "util/SingleTagCollectionHelper.h"
#include "util/XmlLimits.h"
#include "util/XmlUtils.h"

using Util::XmlUtils;

namespace {

std::vector<unsigned char> bytesOf(const std::string& text) {
    return std::vector<unsigned char>(text.begin(), text.end());
}

std::vector<unsigned char> gzipped(const std::string& text) {
    IO::ByteArrayOutputStream out;
    {
        IO::Zip::GzipOutputStream gzip(&out);
        gzip.write(text.data(), static_cast<int>(text.size()));
    }
    return out.getData();
}

// Records the walk and stops where told to.
class RecordingHandler : public Util::SingleTagCollectionHelper {
public:
    explicit RecordingHandler(bool optional) : SingleTagCollectionHelper(optional) {}

    bool onCollectionTag(const TiXmlElement* element) override {
        seen.push_back(std::string("collection ") + XmlUtils::getStringAttr(element, "id", "?"));
        return SingleTagCollectionHelper::onCollectionTag(element);
    }
    bool onItemTag(const TiXmlElement* element) override {
        seen.push_back("item " + XmlUtils::getText(element, ""));
        return XmlUtils::getText(element, "") != stopAt;
    }

    std::vector<std::string> seen;
    std::string stopAt = "none";
};

class XmlUtilsTest : public PalTest {
protected:
    const TiXmlElement* parse(const std::string& text) {
        EXPECT_TRUE(XmlUtils::load(bytesOf(text), false, doc)) << text;
        return doc.RootElement();
    }

    TiXmlDocument doc;
};

}  // namespace

TEST_F(XmlUtilsTest, LoadsPlainOrGzippedDocumentsInPlaceOfThePreviousOne) {
    const std::string text = "<?xml version=\"1.0\"?><startup><uuid>abc</uuid></startup>";
    for (const auto& input : {std::make_pair(bytesOf(text), false), std::make_pair(gzipped(text), true),
                              std::make_pair(bytesOf(text), true)}) {
        parse("<first/>");
        ASSERT_TRUE(XmlUtils::load(input.first, input.second, doc));
        EXPECT_EQ("abc", XmlUtils::getText(doc.RootElement()->FirstChildElement("uuid"), ""));
        EXPECT_EQ(nullptr, doc.RootElement()->NextSiblingElement());
    }
}

TEST_F(XmlUtilsTest, BrokenOrEmptyDocumentsFail) {
    EXPECT_FALSE(XmlUtils::load(bytesOf(""), false, doc));
    EXPECT_FALSE(XmlUtils::load(bytesOf("<a><b></a>"), false, doc));
    EXPECT_FALSE(XmlUtils::load(bytesOf("<a>"), false, doc));
    std::vector<unsigned char> truncated = gzipped("<a>text</a>");
    truncated.resize(truncated.size() - 6);
    EXPECT_FALSE(XmlUtils::load(truncated, true, doc));
}

std::string repeat(const std::string& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i) {
        all += text;
    }
    return all;
}

std::string nested(int depth, const std::string& open = "<a>") {
    return repeat(open, depth) + repeat("</a>", depth);
}

TEST_F(XmlUtilsTest, DocumentsNestedDeeperThanTheLimitAreRefusedBeforeTheParserSeesThem) {
    const int limit = Util::XmlLimits::forAnswers().maxDepth;
    // Closes that TinyXML does not read as closes must not hide depth: in a comment, in CDATA,
    // in attribute values, in a declaration.
    const std::string hidden = repeat("</a>", 100);
    const std::string refused[] = {
        nested(limit + 1),
        nested(50000),
        nested(limit + 1, "<a x='/>' y=\"</a>\">"),
        repeat("<a>", 200) + "<!-- " + hidden + " -->" + repeat("<a>", 100),
        repeat("<a>", 200) + "<![CDATA[" + hidden + "]]>" + repeat("<a>", 100),
        repeat("<a attr = \"" + hidden + "\">", 300),
        "<r>" + repeat("<a>", 200) + "<?xml version=\"" + hidden + "\"?>" + repeat("<a>", 100),
        "<r>" + repeat("<a>", 200) + "<?xml foo='a version=\"b'?>" + hidden + "\">" + repeat("<a>", 100),
        repeat("<\xc3\xa9>", limit + 1),
    };
    for (const std::string& text : refused) {
        clearLog();
        EXPECT_FALSE(XmlUtils::load(bytesOf(text), false, doc)) << text.substr(0, 80);
        EXPECT_EQ(1, countLogLines("XmlUtils::load()[")) << text.substr(0, 80);
        EXPECT_EQ(nullptr, doc.RootElement());
    }

    const std::string accepted[] = {
        nested(limit),
        "<?xml version=\"1.0\" encoding='UTF-8' ?><!DOCTYPE r><r>" + repeat("<a x=\"1\"/><b>t</b>", 2000) +
            "<!-- <a><a> -->" + nested(limit - 1, "<a y='>'>") + "</r>",
    };
    for (const std::string& text : accepted) {
        EXPECT_TRUE(XmlUtils::load(bytesOf(text), false, doc)) << text.substr(0, 80);
    }
}

// A UTF-8 lead byte announcing more bytes than follow must not swallow markup: "\xE0</a>" read
// as one character would nest 90,000 levels past the depth check and overflow the stack.
TEST_F(XmlUtilsTest, MalformedUtf8CannotHideMarkupFromTheDepthCheck) {
    const std::string utf8 = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>";
    const auto* root = parse(utf8 + "<r>" + repeat("<a>\xe0</a>", 90000) + "</r>");
    ASSERT_NE(nullptr, root);
    EXPECT_STREQ("?", XmlUtils::getText(root->FirstChildElement("a"), "").c_str());
    EXPECT_EQ(nullptr, root->FirstChildElement("a")->FirstChildElement());

    // A comment whose "<!" a lead byte would swallow stays a comment.
    root = parse("<?xml version=\"1.0\"?><r>\xf0<!-- " + repeat("<a>", 1000) + " --></r>");
    ASSERT_NE(nullptr, root);
    EXPECT_EQ(nullptr, root->FirstChildElement());

    // Stray continuation bytes and bytes no sequence starts with.
    root = parse("\xef\xbb\xbf<r>\x80\xff\xc3</r>");
    ASSERT_NE(nullptr, root);
    EXPECT_STREQ("???", XmlUtils::getText(root, "").c_str());
}

TEST_F(XmlUtilsTest, WellFormedUtf8AndSingleByteDocumentsKeepTheirText) {
    const std::string cyrillic = "\xd0\x9f\xd1\x80\xd0\xb8\xd0\xb2\xd0\xb5\xd1\x82";  // UTF-8
    const std::string moscow1251 = "\xcc\xee\xf1\xea\xe2\xe0";                        // ends in 0xE0
    const struct {
        std::string document;
        std::string text;
    } cases[] = {
        {"<?xml version=\"1.0\" encoding=\"utf-8\"?><r>" + cyrillic + " &#1055;</r>", cyrillic + " \xd0\x9f"},
        {"<?xml version=\"1.0\"?><r>" + cyrillic + "</r>", cyrillic},
        {"\xef\xbb\xbf<r>" + cyrillic + "</r>", cyrillic},
        {"<?xml version=\"1.0\" encoding=\"windows-1251\"?><r>" + moscow1251 + "</r>", moscow1251},
        {"<r>" + moscow1251 + "</r>", moscow1251},
    };
    for (const auto& c : cases) {
        const auto* root = parse(c.document);
        ASSERT_NE(nullptr, root) << c.document;
        EXPECT_EQ(c.text, XmlUtils::getText(root, "")) << c.document;
    }
}

TEST_F(XmlUtilsTest, TextAndAttributeGettersFallBackForMissingOrUnreadableValues) {
    const TiXmlElement* root =
        parse("<r s=\"v\" i=\"-12\" f=\"2.5\" bad=\"x\"><n> 42x</n><f>-2.5e1</f><empty/><s>text</s></r>");
    EXPECT_EQ(42, XmlUtils::getValueAsInt(root->FirstChildElement("n")));
    EXPECT_FLOAT_EQ(-25.0f, XmlUtils::getValueAsFloat(root->FirstChildElement("f")));
    EXPECT_EQ(0, XmlUtils::getValueAsInt(root->FirstChildElement("empty")));
    EXPECT_EQ(0.0f, XmlUtils::getValueAsFloat(root->FirstChildElement("missing")));
    EXPECT_EQ("fallback", XmlUtils::getText(root->FirstChildElement("empty"), "fallback"));
    EXPECT_EQ("fallback", XmlUtils::getText(nullptr, "fallback"));
    EXPECT_EQ("text", XmlUtils::getText(root->FirstChildElement("s"), "fallback"));

    EXPECT_STREQ("v", XmlUtils::getStringAttr(root, "s", "d"));
    EXPECT_STREQ("d", XmlUtils::getStringAttr(root, "missing", "d"));
    EXPECT_EQ(-12, XmlUtils::getIntAttr(root, "i", 3));
    EXPECT_EQ(3, XmlUtils::getIntAttr(root, "missing", 3));
    EXPECT_EQ(3, XmlUtils::getIntAttr(root, "bad", 3));
    EXPECT_FLOAT_EQ(2.5f, XmlUtils::getFloatAttr(root, "f", 1.0f));
    EXPECT_FLOAT_EQ(1.0f, XmlUtils::getFloatAttr(root, "missing", 1.0f));
    EXPECT_EQ(3, XmlUtils::getIntAttr(nullptr, "i", 3));
}

// TinyXML's float queries go through sscanf, which stops at the '.' under a decimal-comma locale
// and took coordinates from server answers as whole numbers.
TEST_F(XmlUtilsTest, FloatsReadTheSameUnderADecimalCommaLocale) {
    ScopedLocale german("de_DE.UTF-8");
    if (!german.active()) {
        GTEST_SKIP() << "no de_DE.UTF-8 locale";
    }
    const TiXmlElement* root = parse("<r f=\"48.125\" g=\"x\"><v>-2.75</v></r>");
    EXPECT_EQ(48.125f, XmlUtils::getFloatAttr(root, "f", 1.0f));
    EXPECT_EQ(1.0f, XmlUtils::getFloatAttr(root, "g", 1.0f));
    EXPECT_EQ(-2.75f, XmlUtils::getValueAsFloat(root->FirstChildElement("v")));
}

TEST_F(XmlUtilsTest, ChildGettersReportMissingChildren) {
    const TiXmlElement* root = parse("<r><n>-7</n><u>4000000000</u><big>5000000000</big><e/></r>");
    int number = 99;
    EXPECT_TRUE(XmlUtils::getChildValueAsInt(root, "n", number));
    EXPECT_EQ(-7, number);
    number = 99;
    EXPECT_FALSE(XmlUtils::getChildValueAsInt(root, "missing", number));
    EXPECT_EQ(99, number);

    unsigned int unsignedNumber = 5;
    EXPECT_FALSE(XmlUtils::getChildValueAsUInt(root, "n", unsignedNumber));
    EXPECT_FALSE(XmlUtils::getChildValueAsUInt(root, "big", unsignedNumber));
    EXPECT_FALSE(XmlUtils::getChildValueAsUInt(root, "missing", unsignedNumber));
    EXPECT_EQ(5u, unsignedNumber);
    EXPECT_TRUE(XmlUtils::getChildValueAsUInt(root, "u", unsignedNumber));
    EXPECT_EQ(4000000000u, unsignedNumber);

    std::string text = "old";
    EXPECT_TRUE(XmlUtils::getChildValueAsString(root, "e", text));
    EXPECT_EQ("", text);
    text = "old";
    EXPECT_FALSE(XmlUtils::getChildValueAsString(root, "missing", text));
    EXPECT_EQ("old", text);
}

TEST_F(XmlUtilsTest, BoolAttributeTruthTable) {
    const TiXmlElement* root = parse(
        "<r zero=\"0\" f1=\"false\" f2=\"FALSE\" f3=\"fAlSe\" one=\"1\" t=\"true\" no=\"no\" empty=\"\""
        " falsy=\"falsey\" zeros=\"00\"/>");
    for (const char* name : {"zero", "f1", "f2", "f3", "missing"}) {
        EXPECT_FALSE(XmlUtils::getBoolAttr(root, name)) << name;
    }
    for (const char* name : {"one", "t", "no", "empty", "falsy", "zeros"}) {
        EXPECT_TRUE(XmlUtils::getBoolAttr(root, name)) << name;
    }
}

TEST_F(XmlUtilsTest, WalksCollectionsAndItemsInDocumentOrderUntilAHandlerSaysStop) {
    const TiXmlElement* root =
        parse("<r><other/><hosts id=\"h\"><host>a</host><x>no</x><host>b</host><host>c</host></hosts></r>");
    RecordingHandler handler(false);
    EXPECT_TRUE(XmlUtils::parseTagCollections("hosts", "host", root, handler));
    EXPECT_EQ((std::vector<std::string>{"collection h", "item a", "item b", "item c"}), handler.seen);

    RecordingHandler stopping(false);
    stopping.stopAt = "b";
    EXPECT_FALSE(XmlUtils::parseTagCollections("hosts", "host", root, stopping));
    EXPECT_EQ((std::vector<std::string>{"collection h", "item a", "item b"}), stopping.seen);
}

TEST_F(XmlUtilsTest, SingleCollectionHelperRefusesASecondCollectionAndAcceptsNoneOnlyWhenOptional) {
    const TiXmlElement* root =
        parse("<r><hosts id=\"1\"><host>a</host></hosts><hosts id=\"2\"><host>b</host></hosts></r>");
    RecordingHandler handler(true);
    EXPECT_FALSE(XmlUtils::parseTagCollections("hosts", "host", root, handler));
    EXPECT_EQ((std::vector<std::string>{"collection 1", "item a", "collection 2"}), handler.seen);
    EXPECT_TRUE(hasLogLine("Several <hosts> tags"));

    root = parse("<r><host>a</host></r>");
    RecordingHandler optional(true);
    EXPECT_TRUE(XmlUtils::parseTagCollections("hosts", "host", root, optional));
    EXPECT_TRUE(optional.seen.empty());
    RecordingHandler required(false);
    EXPECT_FALSE(XmlUtils::parseTagCollections("hosts", "host", root, required));
}

TEST_F(XmlUtilsTest, NullParentOrElementIsAProgrammingError) {
    RecordingHandler handler(true);
    EXPECT_FALSE(XmlUtils::parseTagCollections("hosts", "host", nullptr, handler));
    expectAssertion("parent");
    EXPECT_FALSE(handler.SingleTagCollectionHelper::onCollectionTag(nullptr));
    expectAssertion("element");
}
