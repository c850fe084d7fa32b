// The positioning server's answers, well-formed and broken. The parser needs
// no platform beyond its string functions, which work without a boot.
#include <gtest/gtest.h>
#include <tinyxml.h>

#include <GeographicLib/Geodesic.hpp>
#include <cmath>
#include <string>
#include <vector>

#include "wireless/impl/LbsResponseParser.h"

namespace {

using Wireless::LbsNetworkRequest;
using Wireless::LbsResponseParser;

LbsNetworkRequest::Response parse(const std::string& body, int code = 200, bool errorBodyAnnounced = false) {
    return LbsResponseParser::parse(std::vector<unsigned char>(body.begin(), body.end()), code,
                                    errorBodyAnnounced);
}

std::string coordinates(const std::string& attributes) {
    return "<location><coordinates " + attributes + "/></location>";
}

double geodesicMetres(double lat1, double lon1, double lat2, double lon2) {
    double metres = 0;
    GeographicLib::Geodesic::WGS84().Inverse(lat1, lon1, lat2, lon2, metres);
    return metres;
}

TEST(LbsResponseParserTest, ReadsPositionsAndFailures) {
    const struct {
        const char* name;
        int code;
        bool announced;
        std::string body;
        LbsNetworkRequest::Response expected;
    } cases[] = {
        {"accuracy",
         200,
         false,
         coordinates("latitude=\"52.5\" longitude=\"13.25\" accuracy=\"35.5\""),
         {0, 52.5f, 13.25f, 35.5f}},
        {"declaration and blanks",
         200,
         false,
         "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<location>\n  <coordinates latitude=\" -33.75 \" "
         "longitude=\"151.125\" accuracy=\"1200\"/>\n</location>\n",
         {0, -33.75f, 151.125f, 1200.0f}},
        {"written by ElementTree",
         200,
         false,
         "<?xml version='1.0' encoding='UTF-8'?>\n<location><coordinates latitude=\"52.520008\" "
         "longitude=\"13.404954\" accuracy=\"35.5\" /></location>",
         {0, 52.520008f, 13.404954f, 35.5f}},
        {"negative accuracy passes",
         200,
         false,
         coordinates("latitude=\"1\" longitude=\"2\" accuracy=\"-1\""),
         {0, 1.0f, 2.0f, -1.0f}},
        {"no accuracy",
         200,
         false,
         coordinates("latitude=\"52.5\" longitude=\"13.25\""),
         {1, 52.5f, 13.25f, 1e9f}},
        {"server error", 200, false, "<error code=\"17\"/>", {17, 0, 0, 0}},
        {"neither element", 200, false, "<answer/>", {1, 0, 0, 0}},
        {"empty body", 200, false, "", {1, 0, 0, 0}},
        {"404 with body", 404, true, "", {404, 0, 0, 0}},
        {"404 without body", 404, false, "", {1, 0, 0, 0}},
        {"transport failure", -7, false, "", {1, 0, 0, 0}},
        {"2xx other than 200", 204, false, "", {1, 0, 0, 0}},
        {"clean finish without answer", 0, true, "", {1, 0, 0, 0}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const LbsNetworkRequest::Response response = parse(c.body, c.code, c.announced);
        EXPECT_EQ(c.expected.error, response.error);
        EXPECT_FLOAT_EQ(c.expected.latitude, response.latitude);
        EXPECT_FLOAT_EQ(c.expected.longitude, response.longitude);
        EXPECT_FLOAT_EQ(c.expected.accuracy, response.accuracy);
    }
}

TEST(LbsResponseParserTest, SecondCoordinatesBoundTheAccuracyByTheNearerOne) {
    const double kTolerance = 0.005;
    const double northSouth = geodesicMetres(48.0, 11.0, 48.001, 11.0);
    const double eastWest = geodesicMetres(48.0, 11.0, 48.0, 11.0005);
    ASSERT_LT(eastWest, northSouth);
    EXPECT_NEAR(111.0, northSouth, 1.0);

    LbsNetworkRequest::Response response =
        parse(coordinates("latitude=\"48\" longitude=\"11\" nlatitude=\"48.001\""));
    EXPECT_EQ(0, response.error);
    EXPECT_NEAR(northSouth, response.accuracy, northSouth * kTolerance);

    response = parse(coordinates("latitude=\"48\" longitude=\"11\" nlongitude=\"11.0005\""));
    EXPECT_EQ(0, response.error);
    EXPECT_NEAR(eastWest, response.accuracy, eastWest * kTolerance);

    response =
        parse(coordinates("latitude=\"48\" longitude=\"11\" nlatitude=\"48.001\" nlongitude=\"11.0005\""));
    EXPECT_EQ(0, response.error);
    EXPECT_NEAR(eastWest, response.accuracy, eastWest * kTolerance);
}

TEST(LbsResponseParserTest, BrokenXmlGivesTheParsersErrorNumber) {
    for (const std::string body : {"<location><coordinates", "not xml at all", "<location></locaton>"}) {
        TiXmlDocument reference;
        reference.Parse(body.c_str());
        ASSERT_TRUE(reference.Error()) << body;
        EXPECT_EQ(reference.ErrorId(), parse(body).error) << body;
    }
}

TEST(LbsResponseParserTest, MalformedAnswersGiveErrorOneWithoutCoordinates) {
    const std::string malformed[] = {
        "<location/>",
        "<location><position latitude=\"1\" longitude=\"2\" accuracy=\"3\"/></location>",
        coordinates("longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"52\" accuracy=\"5\""),
        coordinates("latitude=\"\" longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"north\" longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"52.5x\" longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"nan\" longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"90.5\" longitude=\"13\" accuracy=\"5\""),
        coordinates("latitude=\"52\" longitude=\"-180.5\" accuracy=\"5\""),
        coordinates("latitude=\"52\" longitude=\"13\" accuracy=\"inf\""),
        coordinates("latitude=\"52\" longitude=\"13\" accuracy=\"wide\""),
        coordinates("latitude=\"52\" longitude=\"13\" nlatitude=\"x\""),
        coordinates("latitude=\"52\" longitude=\"13\" nlatitude=\"52.001\" nlongitude=\"200\""),
        "<error/>",
        "<error code=\"\"/>",
        "<error code=\"busy\"/>",
        "<error code=\"12x\"/>",
        "<error code=\"0\"/>",
    };
    for (const std::string& body : malformed) {
        const LbsNetworkRequest::Response response = parse(body);
        EXPECT_EQ(1, response.error) << body;
        EXPECT_EQ(0.0f, response.latitude) << body;
        EXPECT_EQ(0.0f, response.longitude) << body;
    }
}

}  // namespace
