#pragma once

#include <sstream>
#include <string>

// Builds a request URL from a base, an optional extra path segment and query parameters.
// Names and values are written as given; callers escape them with Util::UrlCoder when needed.
// Any thread; one builder is used by one thread at a time.
class UrlBuilder {
public:
    static const int DEFAULT_PRECISION = 6;

    explicit UrlBuilder(const std::string& hostPortAndPath = std::string());
    virtual ~UrlBuilder();

    UrlBuilder(const UrlBuilder&) = delete;
    UrlBuilder& operator=(const UrlBuilder&) = delete;

    void setHostPortAndPath(const std::string& value) { hostPortAndPath = value; }
    void setAdditionPath(const std::string& value) { additionPath = value; }

    UrlBuilder& addEmptyParam(const std::string& name);
    UrlBuilder& addStringParam(const std::string& name, const std::string& value);
    UrlBuilder& addIntParam(const std::string& name, int value);
    UrlBuilder& addUIntParam(const std::string& name, unsigned int value);
    UrlBuilder& addIntPairParam(const std::string& name, int a, int b);
    UrlBuilder& addFloatParam(const std::string& name, double value, int precision = DEFAULT_PRECISION);
    UrlBuilder& addFloatPairParam(const std::string& name, double a, double b);

    // The query text built so far, for callers that write parameters of their own.
    std::ostringstream& getParamStream() { return paramStream; }

    // Starts a new URL on the given base: no parameters, no extra path.
    void clean(const std::string& newHostPortAndPath);

    // The base and the extra path joined by exactly one "/", then the query text.
    std::string buildString() const;

protected:
    // Writes "?" before the first parameter and "&" before every later one, then the name.
    std::ostringstream& beginParam(const std::string& name);

private:
    void resetParamStream();

    std::string hostPortAndPath;
    std::string additionPath;
    std::ostringstream paramStream;
    bool hasParams = false;
};
