#include "devserver/StartupAnswer.h"

#include <tinyxml.h>

#include <map>

namespace DevServer {

namespace {

// The host types the library itself reads; the application's own types fall
// back to "default".
const char* const kOwnHostTypes[] = {"default", "startup", "cellid"};

TiXmlElement* addText(TiXmlElement& parent, const char* name, const std::string& text) {
    TiXmlElement* element = new TiXmlElement(name);
    element->LinkEndChild(new TiXmlText(text));
    parent.LinkEndChild(element);
    return element;
}

}  // namespace

std::string StartupAnswer::build(const Config& config, const std::string& baseUrl, const std::string& uuid) {
    TiXmlDocument document;
    document.LinkEndChild(new TiXmlDeclaration("1.0", "UTF-8", ""));
    TiXmlElement* startup = new TiXmlElement("startup");
    document.LinkEndChild(startup);
    addText(*startup, "uuid", uuid);
    if (!config.deviceId.empty()) {
        addText(*startup, "deviceid", config.deviceId);
    }

    std::map<std::string, std::string> hosts;
    for (const char* type : kOwnHostTypes) {
        hosts[type] = baseUrl;
    }
    for (const auto& host : config.hosts) {
        hosts[host.first] = host.second;
    }
    TiXmlElement* queryHosts = new TiXmlElement("query_hosts");
    startup->LinkEndChild(queryHosts);
    for (const auto& host : hosts) {
        addText(*queryHosts, "host", host.second)->SetAttribute("type", host.first);
    }

    TiXmlElement* features = new TiXmlElement("features");
    startup->LinkEndChild(features);
    TiXmlElement* scanner = new TiXmlElement("network_scanner");
    scanner->SetAttribute("enabled", config.networkScanner ? 1 : 0);
    scanner->SetAttribute("scan_timeout", config.scanTimeout);
    scanner->SetAttribute("send_timeout", config.sendTimeout);
    features->LinkEndChild(scanner);

    TiXmlPrinter printer;
    printer.SetIndent("  ");
    document.Accept(&printer);
    return printer.Str();
}

}  // namespace DevServer
