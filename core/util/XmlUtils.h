#pragma once

#include <string>
#include <vector>

class TiXmlDocument;
class TiXmlElement;

namespace IO {
class InputStream;
}

namespace Util {

class TagCollectionHandler;

// Loading TinyXML documents from streams and reading values with defaults. A null element
// counts as missing, so lookups chain without checks. Any thread, on documents it owns.
class XmlUtils {
public:
    // Parses bytes, gunzipping them first when gzipped (bytes that are not gzip data are parsed
    // as they are). True when the document reports no error.
    static bool load(const std::vector<unsigned char>& bytes, bool gzipped, TiXmlDocument& doc);
    // Parses everything the stream has left through XmlLoader with XmlLimits::forAnswers(); the
    // document's previous content is dropped. A refusal is logged with its reason.
    static bool load(IO::InputStream* stream, TiXmlDocument& doc);

    // The element's text, or defaultValue when it has none.
    static std::string getText(const TiXmlElement* element, const std::string& defaultValue);
    // The text as a number; 0 without text.
    static int getValueAsInt(const TiXmlElement* element);
    static float getValueAsFloat(const TiXmlElement* element);

    // False when there is no child element of that name; value is then untouched.
    static bool getChildValueAsInt(const TiXmlElement* element, const char* name, int& value);
    // Also false when the number is negative or does not fit.
    static bool getChildValueAsUInt(const TiXmlElement* element, const char* name, unsigned int& value);
    // The child's text, empty when it has none.
    static bool getChildValueAsString(const TiXmlElement* element, const char* name, std::string& value);

    static const char* getStringAttr(const TiXmlElement* element, const char* name, const char* defaultValue);
    // defaultValue when the attribute is absent or not a number.
    static int getIntAttr(const TiXmlElement* element, const char* name, int defaultValue);
    static float getFloatAttr(const TiXmlElement* element, const char* name, float defaultValue);
    // False when absent, "0" or "false" in any letter case; true for anything else.
    static bool getBoolAttr(const TiXmlElement* element, const char* name);

    // Walks the children of parent named collectionTag, and in each its children named itemTag,
    // in document order, stopping with false at the first handler call that returns false.
    // Without any collection element the handler's onCollectionTagNotFound() decides.
    static bool parseTagCollections(const char* collectionTag, const char* itemTag,
                                    const TiXmlElement* parent, TagCollectionHandler& handler);
};

}  // namespace Util
