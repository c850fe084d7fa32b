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
#include "util/XmlLoader.h"

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
    std::string error;
    if (!XmlLoader::load(*stream, XmlLimits::forAnswers(), doc, error)) {
        Logger::log(Logger::Error, "XmlUtils::load()[%s]", error.c_str());
        return false;
    }
    return true;
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
    return text ? kdStrtof(text, nullptr) : 0.0f;
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

// TinyXML's own float queries go through sscanf, which reads "48.125" as 48 under a
// decimal-comma locale; the platform's conversion always reads a point.
float XmlUtils::getFloatAttr(const TiXmlElement* element, const char* name, float defaultValue) {
    const char* text = element ? element->Attribute(name) : nullptr;
    if (!text) {
        return defaultValue;
    }
    KDchar* end = nullptr;
    const float value = kdStrtof(text, &end);
    return end != text ? value : defaultValue;
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
