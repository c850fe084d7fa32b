#include "wireless/impl/LbsResponseParser.h"

#include <KD/kd.h>
#include <tinyxml.h>

#include <cmath>

#include "math/CoordConversion.h"
#include "util/XmlUtils.h"

namespace Wireless {

namespace {

typedef LbsNetworkRequest::Response Response;

// The accuracy of a position whose answer bounds its error nowhere.
const float kUnknownAccuracy = 1000000000.0f;

enum class Attribute { Absent, Number, Malformed };

bool isSpace(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

// A finite number filling the whole attribute (blanks around it allowed).
Attribute readNumber(const TiXmlElement* element, const char* name, float& value) {
    const char* text = element->Attribute(name);
    if (text == nullptr) {
        return Attribute::Absent;
    }
    char* end = nullptr;
    value = kdStrtof(text, &end);
    if (end == text) {
        return Attribute::Malformed;
    }
    while (isSpace(*end)) {
        ++end;
    }
    return *end == '\0' && std::isfinite(value) ? Attribute::Number : Attribute::Malformed;
}

// A number within [-limit, limit]; anything else, absence included, is malformed.
bool readCoordinate(const TiXmlElement* element, const char* name, float limit, float& value) {
    return readNumber(element, name, value) == Attribute::Number && std::fabs(value) <= limit;
}

Attribute readOptionalCoordinate(const TiXmlElement* element, const char* name, float limit, float& value) {
    const Attribute attribute = readNumber(element, name, value);
    if (attribute == Attribute::Number && std::fabs(value) > limit) {
        return Attribute::Malformed;
    }
    return attribute;
}

Response readLocation(const TiXmlElement* location) {
    const TiXmlElement* coordinates = location->FirstChildElement("coordinates");
    float latitude = 0;
    float longitude = 0;
    if (coordinates == nullptr || !readCoordinate(coordinates, "latitude", 90, latitude) ||
        !readCoordinate(coordinates, "longitude", 180, longitude)) {
        return Response();
    }
    Response response;
    response.latitude = latitude;
    response.longitude = longitude;
    float accuracy = 0;
    switch (readNumber(coordinates, "accuracy", accuracy)) {
        case Attribute::Number:
            response.error = 0;
            response.accuracy = accuracy;
            return response;
        case Attribute::Malformed:
            return Response();
        case Attribute::Absent:
            break;
    }
    // Without an accuracy, a second latitude and a second longitude bound
    // the error: the nearer of the two gives it.
    response.accuracy = kUnknownAccuracy;
    float nlatitude = 0;
    float nlongitude = 0;
    const Attribute northSouth = readOptionalCoordinate(coordinates, "nlatitude", 90, nlatitude);
    const Attribute eastWest = readOptionalCoordinate(coordinates, "nlongitude", 180, nlongitude);
    if (northSouth == Attribute::Malformed || eastWest == Attribute::Malformed) {
        return Response();
    }
    if (northSouth == Attribute::Number) {
        response.error = 0;
        const float distance = CoordConversion::getDistance(latitude, longitude, nlatitude, longitude);
        response.accuracy = distance < kUnknownAccuracy ? distance : kUnknownAccuracy;
    }
    if (eastWest == Attribute::Number) {
        response.error = 0;
        const float distance = CoordConversion::getDistance(latitude, longitude, latitude, nlongitude);
        if (distance < response.accuracy) {
            response.accuracy = distance;
        }
    }
    return response;
}

// The server's non-zero decimal code; a missing, non-numeric or zero code
// makes the answer unusable.
Response readError(const TiXmlElement* error) {
    Response response;
    const char* text = error->Attribute("code");
    if (text == nullptr) {
        return response;
    }
    char* end = nullptr;
    const int code = kdStrtol(text, &end, 10);
    if (end == text) {
        return response;
    }
    while (isSpace(*end)) {
        ++end;
    }
    if (*end == '\0' && code != 0) {
        response.error = code;
    }
    return response;
}

}  // namespace

Response LbsResponseParser::parse(const std::vector<unsigned char>& body, int code, bool errorBodyAnnounced) {
    Response response;
    if (code != 200) {
        // Without a body the failure says nothing beyond "no usable answer";
        // a 0 code must never read as success.
        const bool hadBody = !body.empty() || errorBodyAnnounced;
        response.error = hadBody && code != 0 ? code : 1;
        return response;
    }
    if (body.empty()) {
        return response;
    }
    TiXmlDocument document;
    if (!Util::XmlUtils::load(body, false, document)) {
        response.error = document.ErrorId() != 0 ? document.ErrorId() : 1;
        return response;
    }
    if (const TiXmlElement* location = document.FirstChildElement("location")) {
        return readLocation(location);
    }
    if (const TiXmlElement* error = document.FirstChildElement("error")) {
        return readError(error);
    }
    return response;
}

}  // namespace Wireless
