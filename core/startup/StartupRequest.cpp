#include "startup/StartupRequest.h"

#include <KD/kd.h>
#include <tinyxml.h>

#include "network/HttpRequest.h"
#include "startup/StartupData.h"
#include "util/Logger.h"
#include "util/UrlBuilder.h"
#include "util/UrlCoder.h"
#include "util/XmlUtils.h"

namespace Startup {

namespace {

const int kTimeoutMs = 30000;

}  // namespace

StartupRequest::StartupRequest(StartupParams& newParams, ReadyCallback onReady)
    : parsed(false), onReady(onReady) {
    params.swap(newParams);
}

StartupRequest::~StartupRequest() {}

std::string StartupRequest::buildUrl() const {
    const StartupData* startupData = StartupData::getInstance();
    const std::string& host = startupData->getHost(StartupData::HOST_STARTUP);
    KD_ASSERT(!host.empty());
    UrlBuilder builder(host);
    builder.setAdditionPath(startupData->startupPath);
    // Both come from outside (the uuid from the server's own answer): unescaped, a space or
    // "&" in them breaks the URL or adds parameters, and "+" arrives as a space.
    builder.addStringParam("uuid", Util::UrlCoder::urlEncodeString(startupData->uuid));
    builder.addStringParam("lang", Util::UrlCoder::urlEncodeString(startupData->lang));
    for (const StartupParams::value_type& param : params) {
        builder.addStringParam(Util::UrlCoder::urlEncodeString(param.first),
                               Util::UrlCoder::urlEncodeString(param.second));
        kdLogFormatMessage("StartupRequest: param[%s] == %s", param.first.c_str(), param.second.c_str());
    }
    builder.addIntParam("utf", 1);
    return builder.buildString();
}

boost::shared_ptr<Network::HttpRequest> StartupRequest::issueRequest() const {
    const std::string url = buildUrl();
    kdLogMessage(url.c_str());
    return Network::HttpRequest::create(url.c_str(), "GET", kTimeoutMs, false);
}

void StartupRequest::onBytesReceived(const std::vector<unsigned char>& bytes) {
    document.reset(new TiXmlDocument());
    if (Util::XmlUtils::load(bytes, false, *document)) {
        parsed = true;
    }
}

void StartupRequest::onFinished(int code) {
    (void)code;
    if (!parsed) {
        return;
    }
    Logger::log(Logger::Debug, "Finished startup request");
    // The receiver may release this request while it reads the document.
    const boost::shared_ptr<TiXmlDocument> answer = document;
    onReady(answer.get());
}

}  // namespace Startup
