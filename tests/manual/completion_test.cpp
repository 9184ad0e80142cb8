// The scripts are run by the shells that they are for.
#include "programs/manual/completion.h"

#include <gmock/gmock.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>
#include <string>

using namespace testing;
namespace fs = std::filesystem;

namespace {

Base::CommandInfo const PROGRAM{
    "tool",
    "Does things",
    {{{"-h", "--help"}, "", "Print this help"}},
    {{"mail", "Sends: it's quick", {{{"-o", "--output"}, "FILE", "Where to"}, {{"--json"}, "", "As JSON"}}},
     {"settings", "Changes", {}, {{"show", "Shows", {{{"--origin"}, "", "From where"}}}}}}};

bool has(char const* shell) {
    return std::system(("command -v " + std::string(shell) + " >/dev/null 2>&1").c_str()) == 0;
}

class Completion : public Test {
protected:
    Completion() {
        std::string name = (fs::temp_directory_path() / "completion.XXXXXX").string();
        folder_ = ::mkdtemp(name.data());
        std::ofstream(folder_ / "a file.pdf") << "x";
    }
    ~Completion() override { fs::remove_all(folder_); }

    std::string write(std::string const& script) {
        std::ofstream(folder_ / "script") << script;
        return (folder_ / "script").string();
    }
    /// The lines that a shell prints, run in the folder.
    std::set<std::string> linesOf(std::string const& command) const {
        std::set<std::string> lines;
        FILE* const pipe = ::popen(("cd '" + folder_.string() + "' && " + command).c_str(), "r");
        char line[512];
        while (std::fgets(line, sizeof line, pipe))
            lines.insert(std::string(line).substr(0, std::string(line).find('\n')));
        EXPECT_EQ(::pclose(pipe), 0) << command;
        return lines;
    }

    std::set<std::string> inBash(std::string const& words) {
        std::string const script = write(Manual::bashCompletion(PROGRAM));
        return linesOf(
            "bash -c 'source " + script + "; COMP_WORDS=(" + words +
            "); COMP_CWORD=$((${#COMP_WORDS[@]} - 1)); _tool; printf \"%s\\n\" \"${COMPREPLY[@]}\"'");
    }
    std::set<std::string> inZsh(std::string const& words) {
        std::string const script = write(Manual::zshCompletion(PROGRAM));
        return linesOf("zsh -c '_describe() { print -l -- $entries }; _files() { print FILES }; words=(" +
                       words + "); CURRENT=$#words; PREFIX=${words[-1]}; source " + script + "'");
    }
    std::set<std::string> inFish(std::string const& line) {
        std::string const script = write(Manual::fishCompletion(PROGRAM));
        return linesOf("HOME=. fish --no-config -c 'source " + script + "; complete -C \"" + line + "\"'");
    }

    fs::path folder_;
};

TEST_F(Completion, OfBashKnowsCommandsOptionsAndFiles) {
    EXPECT_THAT(inBash("tool m"), UnorderedElementsAre("mail"));
    EXPECT_THAT(inBash("tool mail --"), UnorderedElementsAre("--output", "--json"));
    EXPECT_THAT(inBash("tool settings s"), UnorderedElementsAre("show", "script"));
    EXPECT_THAT(inBash("tool settings show --"), UnorderedElementsAre("--origin"));
    EXPECT_THAT(inBash("tool mail a"), UnorderedElementsAre("a file.pdf"));
    EXPECT_THAT(inBash("tool mail --json --output s"), UnorderedElementsAre("script"));
}

TEST_F(Completion, OfZshKnowsCommandsOptionsAndFiles) {
    if (!has("zsh"))
        GTEST_SKIP() << "zsh is not installed";
    EXPECT_THAT(inZsh("tool m"),
                UnorderedElementsAre("mail:Sends: it's quick", "settings:Changes", "-h:Print this help",
                                     "--help:Print this help", "FILES"));
    EXPECT_THAT(inZsh("tool mail --"),
                UnorderedElementsAre("-o:Where to", "--output:Where to", "--json:As JSON"));
    EXPECT_THAT(inZsh("tool settings show --"), UnorderedElementsAre("--origin:From where"));
    EXPECT_THAT(inZsh("tool mail --output s"), UnorderedElementsAre("FILES"));
}

TEST_F(Completion, OfFishKnowsCommandsAndOptions) {
    if (!has("fish"))
        GTEST_SKIP() << "fish is not installed";
    EXPECT_THAT(inFish("tool m"), Contains("mail\tSends: it's quick"));
    EXPECT_THAT(inFish("tool mail --"), UnorderedElementsAre("--output\tWhere to", "--json\tAs JSON"));
    EXPECT_THAT(inFish("tool settings show --"), UnorderedElementsAre("--origin\tFrom where"));
}

} // namespace
