#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/topics.h"
#include "programs/vlserviced/options.h"
#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <set>
#include <sstream>
#include <string>
#include <variant>

using namespace testing;

namespace {

void collectNames(Base::CommandInfo const& command, std::string const& name, bool onlyWithJson,
                  std::set<std::string>& names) {
    bool const hasJson = std::ranges::any_of(
        command.options, [](Base::OptionInfo const& option) { return option.names.back() == "--json"; });
    if (hasJson || !onlyWithJson)
        names.insert(name);
    for (Base::CommandInfo const& each : command.commands)
        collectNames(each, name.empty() ? each.name : name + ' ' + each.name, onlyWithJson, names);
}

std::set<std::string> commandNames(bool onlyWithJson) {
    std::set<std::string> names;
    collectNames(VlMail::commandInfo(), "", onlyWithJson, names);
    return names;
}

TEST(Topics, ExplainTheJsonOfEachCommandThatGivesSome) {
    std::set<std::string> const commands = commandNames(true);
    EXPECT_GT(commands.size(), 10U);
    for (std::string const& command : commands) {
        Manual::Topic const* const topic = Manual::topicNamed(command, VlMail::topics());
        ASSERT_TRUE(topic) << command;
        EXPECT_THAT(Manual::textOf(*topic), AnyOf(HasSubstr("--json"), HasSubstr("JSON"))) << command;
    }
}

TEST(Topics, AreAllThere) {
    for (Manual::Topic const& topic : VlMail::topics())
        EXPECT_THAT(Manual::textOf(topic), Not(IsEmpty())) << topic.name;
    EXPECT_THROW(Manual::textOf({"x", "none.md", ""}), std::out_of_range);
    EXPECT_THROW(Manual::textOf({"x", "service.md", "No such heading"}), std::out_of_range);
}

TEST(Topics, OfSeveralWordsAreCommands) {
    std::set<std::string> const commands = commandNames(false);
    for (Manual::Topic const& topic : VlMail::topics())
        if (topic.name.find(' ') != std::string_view::npos) {
            EXPECT_TRUE(commands.contains(std::string(topic.name))) << topic.name;
        }
}

TEST(Help, ListsCommandsAndTopics) {
    Ran const ran = runVlMail({"help"});
    EXPECT_EQ(ran.status, VlMail::FINE);
    EXPECT_THAT(ran.out, HasSubstr("\nletter"));
    EXPECT_THAT(ran.out, ContainsRegex("\ntopics: .*exit-status.* presets-documents"));
}

TEST(Help, ExplainsACommandByItsOptionsAndItsPage) {
    Ran const ran = runVlMail({"help", "settings", "show"});
    EXPECT_EQ(ran.status, VlMail::FINE);
    EXPECT_THAT(ran.out,
                StartsWith("Shows what counts at a node\nUsage: vlmail settings show [OPTIONS] NODE"));
    EXPECT_THAT(ran.out, HasSubstr("  origins\n        for every key the node that its value comes from"));
}

TEST(Help, ExplainsATopic) {
    Ran const ran = runVlMail({"help", "exit-status"});
    EXPECT_EQ(ran.status, VlMail::FINE);
    EXPECT_THAT(ran.out, StartsWith("0: done."));
}

TEST(Help, KnowsNothingOfOtherWords) {
    Ran const ran = runVlMail({"help", "letter", "boxes"});
    EXPECT_EQ(ran.status, VlMail::FAILED);
    EXPECT_EQ(ran.err,
              "vlmail: there is no command, topic or code \"letter boxes\"; vlmail help lists what there is; "
              "--help explains [usage]\n");
}

constexpr char const* WITH_LIBRARIES =
    "\nwith Boost 1\\.[0-9]+, HarfBuzz .*, ICU .*, jansson .*, OpenSSL .*, "
    "poppler .*, qpdf .*, SQLite .*, zlib .*\n";

TEST(Version, NamesTheProgramItsCommitAndItsLibraries) {
    char const* const arguments[] = {"vlmail", "--version"};
    std::ostringstream out;
    std::ostringstream err;
    EXPECT_EQ(VlMail::run(2, arguments, {out, err}, "0123abc"), VlMail::FINE);
    EXPECT_THAT(out.str(), MatchesRegex("vlmail [0-9.]+ \\(commit 0123abc\\)" + std::string(WITH_LIBRARIES)));
    EXPECT_THAT(runVlMail({"--version"}).out, MatchesRegex("vlmail [0-9.]+" + std::string(WITH_LIBRARIES)));
}

TEST(Version, IsToldByTheServiceToo) {
    char const* const arguments[] = {"vlserviced", "--version"};
    std::ostringstream out;
    std::ostringstream err;
    auto const parsed = VlServiced::parseOptions(2, arguments, out, err, "0123abc");
    EXPECT_THAT(parsed, VariantWith<int>(0));
    EXPECT_THAT(out.str(),
                MatchesRegex("vlserviced [0-9.]+ \\(commit 0123abc\\)\nwith Boost .*, SQLite .*\n"));
}

} // namespace
