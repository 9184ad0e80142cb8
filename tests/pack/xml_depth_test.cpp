#include "vlservice/pack/xml_depth.h"

#include <gtest/gtest.h>
#include <tinyxml.h>

#include <random>
#include <string>

namespace {

std::string repeated(std::string const& text, int times) {
    std::string all;
    for (int i = 0; i < times; ++i)
        all += text;
    return all;
}

/// The depth that the scan sees.
std::size_t depthOf(std::string const& xml) {
    std::size_t depth = 0;
    while (Container::isNestedDeeperThan(depth, xml))
        ++depth;
    return depth;
}

/// Levels of elements in what the parser built, also when it stopped at an error.
std::size_t parsedDepth(TiXmlNode const& node) {
    std::size_t depth = 0;
    for (TiXmlNode const* child = node.FirstChild(); child; child = child->NextSibling())
        depth = std::max(depth, (child->ToElement() ? 1 : 0) + parsedDepth(*child));
    return depth;
}

std::size_t parsedDepth(std::string const& xml) {
    TiXmlDocument document;
    document.Parse(xml.c_str(), nullptr, TIXML_ENCODING_LEGACY);
    return parsedDepth(document);
}

TEST(XmlDepth, IsToldLevelByLevel) {
    struct Case {
        char const* what;
        std::string xml;
        std::size_t depth;
    };
    Case const cases[] = {
        {"nothing", "", 0},
        {"text alone", "text", 0},
        {"an empty element", "<a/>", 1},
        {"an element", "<a></a>", 1},
        {"an open element", "<a>", 1},
        {"an unfinished tag", "<a", 1},
        {"an index", "<?xml version=\"1.0\"?><v><c id=\"1\"><i name='x'/><i/></c></v>", 3},
        {"siblings", "<a><b></b><c></c><d></d></a>", 2},
        {"a way up and down", "<a><b><c></c></b><d><e><f></f></e></d></a>", 4},
        {"an end tag in a comment", "<a><!-- </a> --><b><!-- </b> --><c></c></b></a>", 3},
        {"a start tag in a comment", "<a><!-- <b><c><d> --></a>", 1},
        {"an end tag in CDATA", "<a><![CDATA[</a>]]><b></b></a>", 2},
        {"an end tag in a quoted value", "<a x=\"</a>\"><b x='</b>'><c></c></b></a>", 3},
        {"an end of a tag in a quoted value", "<a x=\"/>\"><b x='>'></b></a>", 2},
        {"an unquoted value", "<a x=1 y=2><b></b></a>", 2},
        {"an instruction", "<?xml encoding=\">\" ?><a><?do <x?></a>", 1},
        {"a document type", "<!DOCTYPE a><a></a>", 1},
        {"text between", "<a>1<b>2</b>3</a>", 2},
        {"text outside ends it", "<a></a> text <b><c>", 1},
        {"a byte order mark", "\xEF\xBB\xBF<a><b/></a>", 2},
        {"broken markup ends it", "<a><b x></b><c><d><e>", 2},
    };
    for (Case const& c : cases)
        EXPECT_EQ(depthOf(c.xml), c.depth) << c.what;
}

TEST(XmlDepth, CountsManyLevelsWithoutRecursion) {
    std::string const deep = repeated("<a>", 200'000);
    EXPECT_TRUE(Container::isNestedDeeperThan(199'999, deep));
    EXPECT_FALSE(Container::isNestedDeeperThan(200'000, deep));
}

TEST(XmlDepth, IsNeverLessThanWhatTheParserBuilds) {
    char const* const pieces[] = {
        "<a>",       "</a>", "<b x=\"", "\"",        "'",   ">",    "/>", "<!--", "-->",
        "<![CDATA[", "]]>",  "<?xml ",  "?>",        "<!",  "text", " ",  "<",    "=",
        "version",   "x='",  "\xC3",    "\xA0",      "</",  "a",    "/",  "<_ ",  "\xEF\xBB\xBF",
        "&#x3C;",    "&lt;", "<a x=1>", "encoding=", "<b>", "</b>", "\n"};
    unsigned const seed = 20240517;
    std::mt19937 random(seed);
    for (int round = 0; round < 5'000; ++round) {
        std::string xml = round % 2 ? "<a>" : "";
        for (auto i = random() % 40; i > 0; --i)
            xml += pieces[random() % std::size(pieces)];
        EXPECT_GE(depthOf(xml), parsedDepth(xml)) << "seed " << seed << ": " << xml;
    }
}

} // namespace
