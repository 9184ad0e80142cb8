#include "programs/vlmail/terminal/text_table.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

using VlMail::displayWidth;
using VlMail::TextTable;

TEST(TextTable, AlignsColumnsByTheirWidestCell) {
    TextTable table({{"name"}, {"pages", TextTable::Align::Right}, {"state"}});
    table.addRow({"a", "1", "ok"});
    table.addRow({"longer name", "120", ""});
    std::ostringstream out;
    table.print(out, 2);
    EXPECT_EQ(out.str(), "  name         pages  state\n"
                         "  a                1  ok\n"
                         "  longer name    120\n");
}

TEST(TextTable, CountsCharactersAsATerminalShowsThem) {
    EXPECT_EQ(displayWidth("Müller"), 6u);
    EXPECT_EQ(displayWidth("Mu\u0308ller"), 6u) << "a combining mark takes no column";
    EXPECT_EQ(displayWidth("東京"), 4u);
    EXPECT_EQ(displayWidth("a\xFFz"), 3u) << "broken UTF-8 takes a column";
}

TEST(TextTable, KeepsACellOnItsLine) {
    TextTable table({{"value"}});
    table.addRow({"two\nlines\x1b[0m"});
    std::ostringstream out;
    table.print(out);
    EXPECT_EQ(out.str(), "value\ntwo lines\\u001b[0m\n");
}

} // namespace
