#include "support/PalTest.h"
#include "support/ScopedLocale.h"
#include "util/GeoUrlBuilder.h"
#include "util/UrlBuilder.h"

namespace {

std::string joined(const std::string& base, const std::string& path) {
    UrlBuilder builder(base);
    builder.setAdditionPath(path);
    return builder.buildString();
}

}  // namespace

TEST(UrlBuilderTest, JoinsBaseAndPathWithExactlyOneSlash) {
    EXPECT_EQ("http://h:80/api/tiles", joined("http://h:80/api", "tiles"));
    EXPECT_EQ("http://h:80/api/tiles", joined("http://h:80/api/", "tiles"));
    EXPECT_EQ("http://h:80/api/tiles", joined("http://h:80/api", "/tiles"));
    EXPECT_EQ("http://h:80/api/tiles", joined("http://h:80/api/", "/tiles"));
    EXPECT_EQ("http://h:80/api/", joined("http://h:80/api/", ""));
    EXPECT_EQ("http://h:80/api", joined("http://h:80/api", ""));
}

TEST(UrlBuilderTest, FirstParameterFollowsQuestionMarkLaterOnesAmpersandAlsoAfterClean) {
    UrlBuilder builder("http://h/startup");
    builder.addIntParam("a", 1).addIntParam("b", -2).addEmptyParam("c").addStringParam("d", "x y");
    builder.getParamStream() << "&raw=" << 0.5;
    EXPECT_EQ("http://h/startup?a=1&b=-2&c&d=x y&raw=0.500000", builder.buildString());

    builder.setAdditionPath("search");
    builder.clean("http://new/base");
    builder.addIntParam("c", 3).addIntParam("d", 4);
    EXPECT_EQ("http://new/base?c=3&d=4", builder.buildString());
}

namespace {

void expectFixedForms() {
    GeoUrlBuilder builder("u");
    builder.addUIntParam("u", 4000000000u)
        .addIntPairParam("ip", -3, 7)
        .addFloatPairParam("fp", 37.5, 55.25)
        .addFloatParam("f2", 1.0 / 3.0, 2)
        .addFloatParam("f", 1e7);
    builder.addLonLatParam("ll", 13.4, 52.5).addLatLonParam("la", 52.5, 13.4);
    builder.addLonLatPairParam("bbox", 1, -2.5, 3.125, 4);
    EXPECT_EQ(
        "u?u=4000000000&ip=-3,7&fp=37.500000,55.250000&f2=0.33&f=10000000.000000"
        "&ll=13.400000,52.500000&la=52.500000,13.400000&bbox=1.000000,-2.500000~3.125000,4.000000",
        builder.buildString());
}

}  // namespace

TEST(UrlBuilderTest, WritesNumbersAndCoordinatesInTheirFixedFormsAndOrder) {
    expectFixedForms();
}

// A global locale of the application must not group digits or put a decimal comma into a URL.
TEST(UrlBuilderTest, WritesTheSameFormsUnderADecimalCommaLocale) {
    ScopedLocale german("de_DE.UTF-8");
    if (!german.active()) {
        GTEST_SKIP() << "no de_DE.UTF-8 locale";
    }
    expectFixedForms();
}

class UrlBuilderAssertionTest : public PalTest {};

TEST_F(UrlBuilderAssertionTest, EmptyBaseIsAProgrammingError) {
    UrlBuilder builder("");
    builder.addIntParam("a", 1);
    EXPECT_EQ("?a=1", builder.buildString());
    expectAssertion("!hostPortAndPath.empty()");
}
