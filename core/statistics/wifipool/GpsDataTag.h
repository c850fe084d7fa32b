#pragma once

#include "statistics/wifipool/NetworkCollectorNode.h"

namespace Statistics {

// A satellite or network fix; speed and course are optional attributes.
class GpsDataTag : public NetworkCollectorNode {
public:
    GpsDataTag(float lat, float lon)
        : lat(lat), lon(lon), hasSpeed(false), speed(0), hasCourse(false), course(0) {}

    void setSpeed(float value) {
        speed = value;
        hasSpeed = true;
    }
    void setCourse(float value) {
        course = value;
        hasCourse = true;
    }

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    float lat;
    float lon;
    bool hasSpeed;
    float speed;
    bool hasCourse;
    float course;
};

}  // namespace Statistics
