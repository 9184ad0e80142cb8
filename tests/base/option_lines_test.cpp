#include "programs/base/option_lines.h"

#include "tests/support/failure_of.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

Base::CommandInfo const COMMAND{"serve",
                                "",
                                {{{"-d", "--data"}, "FOLDER", ""},
                                 {{"--port"}, "N", ""},
                                 {{"--no-discovery"}, "", ""},
                                 {{"FILE"}, "FILE", ""}}};

std::string textOf(std::string const& file) {
    std::istringstream in(file);
    std::string text;
    for (Base::OptionLine const& line : Base::readOptionLines(in, COMMAND))
        text += line.name + '=' + line.value + '\n';
    return text;
}

struct Wrong {
    char const* name;
    std::string file;
    char const* failure;
};

void PrintTo(Wrong const& wrong, std::ostream* out) { *out << wrong.name; }

class WrongOptionLines : public testing::TestWithParam<Wrong> {};

TEST(OptionLines, GiveNamesAndValuesInTheirOrder) {
    EXPECT_EQ(textOf("data = /var/lib/a b\n\n  # a remark\nport=7117\n\tno-discovery = yes \r\n"),
              "data=/var/lib/a b\nport=7117\nno-discovery=true\n");
    EXPECT_EQ(textOf("no-discovery = no\n"), "no-discovery=false\n");
    EXPECT_EQ(textOf("data = a=b # c\n"), "data=a=b # c\n");
    EXPECT_EQ(textOf(""), "");
}

TEST_P(WrongOptionLines, AreToldWithTheirNumber) {
    EXPECT_EQ(failureOf([] { textOf(GetParam().file); }), GetParam().failure);
}

INSTANTIATE_TEST_SUITE_P(
    All, WrongOptionLines,
    testing::Values(Wrong{"Unknown", "\nprot = 1\n", "line 2: there is no option \"prot\""},
                    Wrong{"Positional", "FILE = a\n", "line 1: there is no option \"FILE\""},
                    Wrong{"Short", "d = a\n", "line 1: there is no option \"d\""},
                    Wrong{"Twice", "port = 1\nport = 2\n", "line 2: names \"port\" again"},
                    Wrong{"Bare", "port\n", "line 1: has no =; write name = value"},
                    Wrong{"Section", "[x]\n", "line 1: has no =; write name = value"},
                    Wrong{"WithoutAValue", "port =\n", "line 1: has no value"},
                    Wrong{"Undecided", "no-discovery = 1\n", "line 1: \"1\" is neither yes nor no"},
                    Wrong{"CutOff", "data = /a\nport = 71",
                          "line 2: does not end with a line feed; the file may be cut off"},
                    Wrong{"Binary", std::string("data\0= a\n", 9), "line 1: is no line of plain text"},
                    Wrong{"Endless", std::string(70000, '#'), "line 1: the file is larger than 64 KiB"}),
    [](auto const& each) { return std::string(each.param.name); });

} // namespace
