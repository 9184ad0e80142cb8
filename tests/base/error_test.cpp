#include "programs/base/error.h"

#include "vlservice/json/json.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <new>
#include <stdexcept>
#include <type_traits>

namespace {

using Base::Code;

// Nobody can fail without a code.
static_assert(!std::is_constructible_v<Base::Error, std::string>);
static_assert(!std::is_constructible_v<Base::Error, char const*>);

std::error_code systemError(std::errc error) { return std::make_error_code(error); }

TEST(CodeOfFailure, IsItsOwnOrThatOfTheNearest) {
    EXPECT_EQ(Base::codeOf(Base::Error(Code::NodeUnknown, "x")), Code::NodeUnknown);
    EXPECT_EQ(Base::codeOf(json::Exc("JSON error")), Code::JsonMalformed);
    EXPECT_EQ(Base::codeOf(std::bad_alloc()), Code::OutOfMemory);
    EXPECT_EQ(Base::codeOf(std::runtime_error("x")), Code::Unexpected);
    EXPECT_EQ(Base::codeOf(std::system_error(systemError(std::errc::no_space_on_device))),
              Code::FileUnwritable);
    EXPECT_EQ(Base::codeOf(
                  std::filesystem::filesystem_error("x", systemError(std::errc::no_such_file_or_directory))),
              Code::FileUnreadable);
    EXPECT_EQ(Base::codeOf(std::system_error(systemError(std::errc::too_many_files_open))),
              Code::SystemFailed);
}

TEST(CodedLine, HasTheCodeBehindItOnce) {
    std::string const line = Base::codedLine(Base::Error(Code::NodeUnknown, "there is no node a=b"));
    EXPECT_EQ(line, "there is no node a=b [node-unknown]");
    EXPECT_EQ(Base::codedLine("The service refuses: " + line, Code::ServiceRefused),
              "The service refuses: there is no node a=b [node-unknown]");
}

TEST(ErrorSaid, TakesTheCodeOffTheLine) {
    Base::Error const said = Base::errorSaid("there is no node a=b [node-unknown]", Code::ServiceRefused);
    EXPECT_STREQ(said.what(), "there is no node a=b");
    EXPECT_EQ(said.code(), Code::NodeUnknown);
}

TEST(ErrorSaid, LeavesALineWithoutACodeAsItIs) {
    for (char const* line : {"", "]", " [", " []", "no code", "an address [::1]", "x [NODE-UNKNOWN]",
                             "[node-unknown]", "x [node-unknown] ", "x [node-unknown"}) {
        Base::Error const said = Base::errorSaid(line, Code::ServiceRefused);
        EXPECT_STREQ(said.what(), line);
        EXPECT_EQ(said.code(), Code::ServiceRefused) << line;
    }
}

} // namespace
