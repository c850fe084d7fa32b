#include "util/GeoUrlBuilder.h"

GeoUrlBuilder::GeoUrlBuilder(const std::string& hostPortAndPath) : UrlBuilder(hostPortAndPath) {}

GeoUrlBuilder& GeoUrlBuilder::addLonLatParam(const std::string& name, double a, double b) {
    addFloatPairParam(name, a, b);
    return *this;
}

GeoUrlBuilder& GeoUrlBuilder::addLatLonParam(const std::string& name, double a, double b) {
    addFloatPairParam(name, a, b);
    return *this;
}

GeoUrlBuilder& GeoUrlBuilder::addLonLatPairParam(const std::string& name, double a, double b, double c,
                                                 double d) {
    beginParam(name) << '=' << a << ',' << b << '~' << c << ',' << d;
    return *this;
}
