#pragma once

#include <tinyxml.h>

#include "startup/StartupFeature.h"
#include "util/XmlUtils.h"

// A feature switched by the "enabled" attribute of features/test in the
// startup answer; counts its hooks.
class TestFeature : public Startup::StartupFeature {
public:
    bool onPaused() override { return true; }
    bool onResumed() override { return true; }

    int started = 0;
    int stopped = 0;
    int parsed = 0;

protected:
    void doOnStartupReadyAndEnabled() override { ++started; }
    void doOnStopByUser() override { ++stopped; }
    void doParseStartup(const TiXmlDocument& document) override {
        ++parsed;
        const TiXmlElement* root = document.FirstChildElement("startup");
        const TiXmlElement* features = root != nullptr ? root->FirstChildElement("features") : nullptr;
        enableFromStartup(Util::XmlUtils::getBoolAttr(
            features != nullptr ? features->FirstChildElement("test") : nullptr, "enabled"));
    }
};
