#include <gtest/gtest.h>

#include "devserver/XmlShape.h"

namespace {

struct Markup {
    const char* text;
    bool accepted;
};

class XmlShapeTest : public ::testing::TestWithParam<Markup> {};

// Depth 2 is allowed here: markup that hides elements from the walker must be
// refused or counted, never skipped over.
TEST_P(XmlShapeTest, AcceptsOnlyMarkupItReadsAsTinyXmlDoes) {
    std::string error;
    EXPECT_EQ(GetParam().accepted, DevServer::XmlShape::check(GetParam().text, 2, error)) << error;
}

INSTANTIATE_TEST_SUITE_P(
    Texts, XmlShapeTest,
    ::testing::Values(Markup{"<?xml version=\"1.0\"?><a x='1' y = \"a>b\"><b/><b></b>text > more</a>", true},
                      Markup{"<a><!-- <b><c><d> --><![CDATA[<b><c><d>]]></a>", true},
                      Markup{"<a><b><c></c></b></a>", false}, Markup{"<a><?pi x><b><c>?></a>", false},
                      Markup{"<!DOCTYPE a [<!ENTITY e \"x\">]><a></a>", false},
                      Markup{"<a x=1><b><c></c></b></a>", false}, Markup{"<a></b>", false},
                      Markup{"<a>", false}, Markup{"<a><!-- never closed", false},
                      Markup{"< a></a>", false}));

}  // namespace
