#include "statistics/wifipool/WifiPoolTag.h"

#include "util/UrlCoder.h"

namespace Statistics {

void WifiPoolTag::appendParams(UrlBuilder& builder) const {
    builder.addStringParam("uuid", uuid);
    builder.addStringParam("app_version", appVersion);
    builder.addStringParam("app_platform", appPlatform);
    builder.addStringParam("clid", Util::UrlCoder::urlEncodeString(clid));
    builder.addStringParam("manufacturer", Util::UrlCoder::urlEncodeString(manufacter));
    builder.addStringParam("model", Util::UrlCoder::urlEncodeString(model));
}

void WifiPoolTag::appendNodeName(std::string& out) const {
    out += "wifipool";
}

void WifiPoolTag::appendNodeTagText(std::string& out) const {
    out += "uuid=\"" + escape(uuid) + "\" app_version=\"" + escape(appVersion) + "\" app_platform=\"" +
           escape(appPlatform) + "\" clid=\"" + escape(clid) + "\" manufacter=\"" + escape(manufacter) +
           "\" model=\"" + escape(model) + "\"";
}

void WifiPoolTag::appendContentText(std::string& out) const {
    (void)out;
}

}  // namespace Statistics
