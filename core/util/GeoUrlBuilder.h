#pragma once

#include "util/UrlBuilder.h"

// A UrlBuilder with the coordinate parameters of the map services. Coordinates are written in
// the order given, with UrlBuilder::DEFAULT_PRECISION decimals.
// Any thread; one builder is used by one thread at a time.
class GeoUrlBuilder : public UrlBuilder {
public:
    explicit GeoUrlBuilder(const std::string& hostPortAndPath = std::string());

    // name=a,b
    GeoUrlBuilder& addLonLatParam(const std::string& name, double a, double b);
    GeoUrlBuilder& addLatLonParam(const std::string& name, double a, double b);
    // name=a,b~c,d
    GeoUrlBuilder& addLonLatPairParam(const std::string& name, double a, double b, double c, double d);
};
