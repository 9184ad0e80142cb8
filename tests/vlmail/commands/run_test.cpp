#include "tests/vlmail/run_vlmail.h"

#include <gmock/gmock.h>

#include <algorithm>

using namespace testing;

namespace {

/// All that a command is told to take, its subcommands' too.
std::string described(Base::CommandInfo const& command) {
    std::string text = command.name + ": " + command.description + '\n';
    for (Base::OptionInfo const& option : command.options) {
        for (std::string const& name : option.names)
            text += name + ' ';
        text += option.value + ' ' + option.help + ' ' + option.standard + (option.isRequired ? " !" : "") +
                (option.takesMany ? " ..." : "") + '\n';
    }
    for (Base::CommandInfo const& each : command.commands)
        text += described(each);
    return text;
}

TEST(CommandLineOfVlMail, KnowsTheSameOfACommandThatIsItsFirstWordAndLittleOfTheOthers) {
    constexpr std::size_t MOST_OF_ONE_SOURCE = 3;
    for (Base::CommandInfo const& command : VlMail::commandInfo().commands) {
        if (command.name == "help")
            continue;
        std::vector<Base::CommandInfo> const added = VlMail::commandInfo(command.name).commands;
        EXPECT_LE(added.size(), MOST_OF_ONE_SOURCE) << command.name;
        auto const same = std::ranges::find(added, command.name, &Base::CommandInfo::name);
        ASSERT_NE(same, added.end()) << command.name;
        EXPECT_EQ(described(*same), described(command));
    }
}

TEST(CommandLineOfVlMail, KnowsAllCommandsBehindAnyOtherFirstWord) {
    std::string const all = described(VlMail::commandInfo());
    for (char const* const word : {"help", "--help", "letters", "Letter", "let", ""})
        EXPECT_EQ(described(VlMail::commandInfo(word)), all) << word;
}

TEST(CommandLineOfVlMail, AnswersTheQuestionForTheVersionWhateverFollows) {
    std::string const version = runVlMail({"--version"}).out;
    EXPECT_THAT(version, StartsWith("vlmail "));
    EXPECT_EQ(runVlMail({"--version", "letter"}).out, version);
}

TEST(CommandLineOfVlMail, TakesTheNameOfAnotherCommandForAFile) {
    Ran const ran = runVlMail({"letter", "mail"});
    EXPECT_EQ(ran.status, VlMail::FAILED);
    EXPECT_EQ(ran.err, "vlmail: mail: there is no such file; check the name [file-unreadable]\n");
}

} // namespace
