#include "util/UrlBuilder.h"

#include <KD/kd.h>

#include <iomanip>
#include <locale>

UrlBuilder::UrlBuilder(const std::string& hostPortAndPath) : hostPortAndPath(hostPortAndPath) {
    resetParamStream();
}

UrlBuilder::~UrlBuilder() {}

UrlBuilder& UrlBuilder::addEmptyParam(const std::string& name) {
    beginParam(name);
    return *this;
}

UrlBuilder& UrlBuilder::addStringParam(const std::string& name, const std::string& value) {
    beginParam(name) << '=' << value;
    return *this;
}

UrlBuilder& UrlBuilder::addIntParam(const std::string& name, int value) {
    beginParam(name) << '=' << value;
    return *this;
}

UrlBuilder& UrlBuilder::addUIntParam(const std::string& name, unsigned int value) {
    beginParam(name) << '=' << value;
    return *this;
}

UrlBuilder& UrlBuilder::addIntPairParam(const std::string& name, int a, int b) {
    beginParam(name) << '=' << a << ',' << b;
    return *this;
}

UrlBuilder& UrlBuilder::addFloatParam(const std::string& name, double value, int precision) {
    beginParam(name) << '=' << std::setprecision(precision) << value << std::setprecision(DEFAULT_PRECISION);
    return *this;
}

UrlBuilder& UrlBuilder::addFloatPairParam(const std::string& name, double a, double b) {
    beginParam(name) << '=' << a << ',' << b;
    return *this;
}

void UrlBuilder::clean(const std::string& newHostPortAndPath) {
    hostPortAndPath = newHostPortAndPath;
    additionPath.clear();
    resetParamStream();
    hasParams = false;
}

std::string UrlBuilder::buildString() const {
    KD_ASSERT(!hostPortAndPath.empty());
    std::string url = hostPortAndPath;
    if (!additionPath.empty()) {
        const bool baseHasSlash = !url.empty() && url[url.size() - 1] == '/';
        const bool pathHasSlash = additionPath[0] == '/';
        if (baseHasSlash && pathHasSlash) {
            url.append(additionPath, 1, std::string::npos);
        } else {
            if (!baseHasSlash && !pathHasSlash) {
                url.push_back('/');
            }
            url.append(additionPath);
        }
    }
    return url + paramStream.str();
}

std::ostringstream& UrlBuilder::beginParam(const std::string& name) {
    paramStream << (hasParams ? '&' : '?') << name;
    hasParams = true;
    return paramStream;
}

void UrlBuilder::resetParamStream() {
    paramStream.str(std::string());
    paramStream.clear();
    // Coordinates must keep their decimal point whatever locale the application chose.
    paramStream.imbue(std::locale::classic());
    paramStream << std::fixed << std::setprecision(DEFAULT_PRECISION);
}
