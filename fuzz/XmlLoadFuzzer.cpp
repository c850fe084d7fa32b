// XML answers and documents through XmlUtils::load, plain or gzipped, then every value reader on
// what was parsed. The first byte chooses: bit 0 gzipped, bit 1 through a stream.
#include <tinyxml.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzSupport.h"
#include "io/ByteArrayInputStream.h"
#include "util/TagCollectionHandler.h"
#include "util/XmlUtils.h"

namespace {

using Util::XmlUtils;

class CountingHandler : public Util::TagCollectionHandler {
public:
    bool onCollectionTag(const TiXmlElement*) override { return ++calls < 1000; }
    bool onItemTag(const TiXmlElement* element) override {
        XmlUtils::getText(element, "");
        return ++calls < 1000;
    }
    bool onCollectionTagNotFound() override { return true; }

private:
    int calls = 0;
};

// Reads what an answer handler would read from each element, without recursion so that a deeply
// nested document cannot exhaust the stack here.
void readValues(const TiXmlElement* root) {
    std::vector<const TiXmlElement*> pending{root};
    int visited = 0;
    while (!pending.empty() && ++visited < 10000) {
        const TiXmlElement* element = pending.back();
        pending.pop_back();
        XmlUtils::getText(element, "none");
        XmlUtils::getValueAsInt(element);
        XmlUtils::getValueAsFloat(element);
        for (const TiXmlAttribute* attribute = element->FirstAttribute(); attribute;
             attribute = attribute->Next()) {
            XmlUtils::getStringAttr(element, attribute->Name(), "");
            XmlUtils::getIntAttr(element, attribute->Name(), -1);
            XmlUtils::getFloatAttr(element, attribute->Name(), -1.0f);
            XmlUtils::getBoolAttr(element, attribute->Name());
        }
        for (const TiXmlElement* child = element->FirstChildElement(); child;
             child = child->NextSiblingElement()) {
            int number = 0;
            unsigned int unsignedNumber = 0;
            std::string text;
            XmlUtils::getChildValueAsInt(element, child->Value(), number);
            XmlUtils::getChildValueAsUInt(element, child->Value(), unsignedNumber);
            XmlUtils::getChildValueAsString(element, child->Value(), text);
            CountingHandler handler;
            XmlUtils::parseTagCollections(child->Value(), "item", element, handler);
            pending.push_back(child);
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    fuzz::bootPlatform();
    if (size == 0) {
        return 0;
    }
    const bool gzipped = (data[0] & 1) != 0;
    const bool throughStream = (data[0] & 2) != 0;
    const std::vector<unsigned char> bytes(data + 1, data + size);
    TiXmlDocument doc;
    bool loaded;
    if (throughStream) {
        IO::ByteArrayInputStream stream(bytes.data(), static_cast<int>(bytes.size()));
        loaded = XmlUtils::load(&stream, doc);
    } else {
        loaded = XmlUtils::load(bytes, gzipped, doc);
    }
    if (loaded && doc.RootElement()) {
        readValues(doc.RootElement());
    }
    return 0;
}
