#include "programs/base/command_line.h"

#include <gmock/gmock.h>

#include <sstream>

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

struct CommandLineReading : testing::Test {
    /// Reads the words behind the program's name; true where there is something to do.
    bool read(std::vector<char const*> words) {
        words.insert(words.begin(), "program");
        return line_.read(static_cast<int>(words.size()), words.data(), out_);
    }
    std::string complaintOn(std::vector<char const*> words) {
        try {
            read(std::move(words));
        } catch (Base::UsageError const& wrong) {
            return wrong.what();
        }
        return "";
    }

    std::ostringstream out_;
    Base::CommandLine line_{"Does things.", "program"};
    Base::Command command_ = line_.command();
    std::string text_;
    std::vector<std::string> texts_;
    std::uint16_t port_ = 7;
    std::size_t count_ = 3;
    bool flag_ = false;
    bool onByDefault_ = true;
};

TEST_F(CommandLineReading, FillsWhatTheOptionsNameAndLeavesTheRest) {
    command_.addOption("-o,--output", text_, "");
    command_.addOption("FILE", texts_, "");
    command_.addOption("--port", port_, "");
    command_.addCount("--jobs", count_, "");
    command_.addFlag("--json", flag_, "");
    command_.addOffFlag("--no-discovery", onByDefault_, "");
    EXPECT_TRUE(read({"a", "-o", "out", "--json", "b"}));
    EXPECT_EQ(text_, "out");
    EXPECT_THAT(texts_, ElementsAre("a", "b"));
    EXPECT_EQ(port_, 7);
    EXPECT_EQ(count_, 3);
    EXPECT_TRUE(flag_);
    EXPECT_TRUE(onByDefault_);
    EXPECT_TRUE(read({"--no-discovery", "--port", "65535", "--jobs", "12"}));
    EXPECT_FALSE(onByDefault_);
    EXPECT_EQ(port_, 65535);
    EXPECT_EQ(count_, 12);
}

TEST_F(CommandLineReading, ReadsAPathWithASpaceAsOne) {
    std::filesystem::path path;
    command_.addOption("--data", path, "");
    EXPECT_TRUE(read({"--data", "my data"}));
    EXPECT_EQ(path, "my data");
}

TEST_F(CommandLineReading, SaysWhatIsWrong) {
    Base::Option const output = command_.addOption("--output", text_, "").required();
    command_.addCount("--jobs", count_, "");
    command_.addOption("--port", port_, "");
    command_.addFlag("--json", flag_, "").excludes(output);
    EXPECT_EQ(complaintOn({}), "--output is required");
    EXPECT_EQ(complaintOn({"--output", "o", "--json"}), "--output excludes --json");
    EXPECT_EQ(complaintOn({"--output", "o", "--jobs", "0"}), "--jobs: \"0\" is no number above 0");
    EXPECT_EQ(complaintOn({"--output", "o", "--jobs", "-1"}), "--jobs: \"-1\" is no number above 0");
    EXPECT_EQ(complaintOn({"--output", "o", "--jobs", "2x"}), "--jobs: \"2x\" is no number above 0");
    EXPECT_EQ(complaintOn({"--output", "o", "--port", "65536"}), "Could not convert: --port = 65536");
}

TEST_F(CommandLineReading, SaysWhatAnOptionNeeds) {
    Base::Option const send = command_.addFlag("--send", flag_, "");
    command_.addOption("--node", text_, "").needs(send);
    EXPECT_EQ(complaintOn({"--node", "n"}), "--node requires --send");
    EXPECT_EQ(complaintOn({"--node", "n", "--send"}), "");
}

TEST_F(CommandLineReading, CallsTheSubcommandThatIsNamed) {
    std::string called;
    command_.requireCommand();
    for (char const* const name : {"list", "verify"})
        command_.addCommand(name, "").whenNamed([&called, name] { called += name; });
    EXPECT_TRUE(read({"verify"}));
    EXPECT_EQ(called, "verify");
    EXPECT_EQ(complaintOn({}), "A subcommand is required");
}

TEST_F(CommandLineReading, LetsASubcommandRefuseItsOptions) {
    command_.addCommand("mail", "").whenNamed([] { throw Base::UsageError("FILE or --plan is required"); });
    EXPECT_EQ(complaintOn({"mail"}), "FILE or --plan is required");
}

TEST_F(CommandLineReading, ExplainsOptionsWithTheirNamesAndDefaultsAndDoesNothingElse) {
    command_.addOption("--data", text_, "Where things are").required().valueName("FOLDER");
    command_.addOption("--port", port_, "Where to listen").valueName("N").showDefault();
    command_.addCount("--jobs", count_, "How many");
    command_.addOffFlag("--no-discovery", onByDefault_, "Keep still");
    EXPECT_FALSE(read({"--help"}));
    EXPECT_EQ(out_.str(), "Does things.\n"
                          "Usage: program [OPTIONS]\n\n"
                          "Options:\n"
                          "  -h,--help                   Print this help message and exit\n"
                          "  --data FOLDER REQUIRED      Where things are\n"
                          "  --port N=7                  Where to listen\n"
                          "  --jobs N                    How many\n"
                          "  --no-discovery              Keep still\n\n");
}

} // namespace
