#pragma once

#include <string>

#include "statistics/wifipool/NetworkCollectorNode.h"
#include "util/UrlBuilder.h"

namespace Statistics {

// The document root: the device's parameters, and the finished chunks as
// children.
class WifiPoolTag : public NetworkCollectorNode {
public:
    WifiPoolTag() : clid("0") {}

    void setUuid(const std::string& value) { uuid = value; }
    void setAppVersion(const std::string& value) { appVersion = value; }
    void setAppPlatform(const std::string& value) { appPlatform = value; }
    void setClid(const std::string& value) { clid = value; }
    void setManufacter(const std::string& value) { manufacter = value; }
    void setModel(const std::string& value) { model = value; }

    // The device parameters of the upload URL. The URL key is "manufacturer"
    // while the attribute is "manufacter": the server reads both so.
    void appendParams(UrlBuilder& builder) const;

    void appendNodeName(std::string& out) const override;
    void appendNodeTagText(std::string& out) const override;
    void appendContentText(std::string& out) const override;

private:
    std::string uuid;
    std::string appVersion;
    std::string appPlatform;
    std::string clid;
    std::string manufacter;
    std::string model;
};

}  // namespace Statistics
