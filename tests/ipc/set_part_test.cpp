// The commands that set a part of a node's settings.

#include "tests/ipc/json_steps.h"
#include "tests/ipc/recording_processor.h"

#include "vlservice/ipc/set_part_tmpl.h"

#include <gmock/gmock.h>

using namespace testing;

namespace {

/// A name that this program's own static object takes before main, as those of other programs may.
std::string const NAME_AT_LOAD = Ipc::SetPartTmpl<Cfg::Inet, 12>::CMD_NAME;

TEST(SetPartNames, AreFormedWhenTheLibraryIsLoaded) { EXPECT_EQ(NAME_AT_LOAD, "\"Set inet\""); }

TEST(SetPartNames, KeepTheirQuotes) {
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::App, 10>::CMD_NAME), "\"Set app\"");
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::Inet, 12>::CMD_NAME), "\"Set inet\"");
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::Presets, 13>::CMD_NAME), "\"Set presets\"");
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::Profiles, 14>::CMD_NAME), "\"Set profiles\"");
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::PO, 15>::CMD_NAME), "\"Set po\"");
    EXPECT_EQ((Ipc::SetPartTmpl<Cfg::Departments, 16>::CMD_NAME), "\"Set deps\"");
}

Cfg::PO po(char const* json) { return Cfg::PO(parse(json), false, false); }

TEST(SetPart, CarriesTheNodeAndThePart) {
    Ipc::SetPO const cmd(nullptr, Cfg::Id("bob/acme"), po(R"({"code":"4711"})"));
    EXPECT_EQ(reqOf(cmd), R"({"cfg_id":"u=bob/a=acme","part":{"code":"4711"}})");
    Ipc::SetPO received(nullptr);
    readReq(received, reqOf(cmd));
    EXPECT_EQ(received.cfgId().str(), "u=bob/a=acme");
    EXPECT_EQ(received.part(false, false).value<Cfg::POFieldIdxs::Code>(), "4711");
}

TEST(SetPart, LeavesOutAPartThatIsInheritedAltogether) {
    Ipc::SetPO const cmd(nullptr, Cfg::Id("bob/acme"), po("{}"));
    EXPECT_EQ(reqOf(cmd), R"({"cfg_id":"u=bob/a=acme"})");
    Ipc::SetPO received(nullptr);
    readReq(received, reqOf(cmd));
    EXPECT_FALSE(received.partJson());
    EXPECT_TRUE(received.part(false, false).isInherited<Cfg::POFieldIdxs::Code>());
}

struct BadRequest {
    char const* name;
    char const* request;
    char const* message;
};

class SetPartRefusing : public TestWithParam<BadRequest> {};

TEST_P(SetPartRefusing, ChangesNothing) {
    Ipc::SetPO cmd(nullptr, Cfg::Id("bob/acme"), po(R"({"code":"4711"})"));
    EXPECT_EQ(jsonError([&] { readReq(cmd, GetParam().request); }), GetParam().message);
    EXPECT_EQ(reqOf(cmd), R"({"cfg_id":"u=bob/a=acme","part":{"code":"4711"}})");
}

INSTANTIATE_TEST_SUITE_P(
    Requests, SetPartRefusing,
    Values(BadRequest{"NoId", R"({"part":{}})", "JSON error: Wrong type: empty. Expected type: string"},
           BadRequest{"IdIsNoText", R"({"cfg_id":[],"part":{}})",
                      "JSON error: Wrong type: array. Expected type: string"},
           BadRequest{"PartIsNoObject", R"({"cfg_id":"a=x","part":[]})",
                      "JSON error: Wrong type: array. Expected type: object"},
           BadRequest{"PartThatItsClassCannotRead", R"({"cfg_id":"a=x","part":{"code":5}})",
                      "JSON error: Wrong type: integer. Expected type: string"}),
    [](auto const& instance) { return instance.param.name; });

TEST(SetPart, CarriesTheErrorBack) {
    Ipc::SetPO cmd(nullptr);
    EXPECT_EQ(respOf(cmd), "{}");
    cmd.setResp("The node is locked.");
    EXPECT_EQ(respOf(cmd), R"({"err":"The node is locked."})");
    Ipc::SetPO received(nullptr);
    EXPECT_TRUE(received.respOK());
    readResp(received, respOf(cmd));
    EXPECT_FALSE(received.respOK());
    EXPECT_EQ(received.respErrMsg(), "The node is locked.");
}

TEST(SetPart, TellsTheSenderWhenTheProcessorSetsNoParts) {
    RecordingProcessor processor;
    Ipc::SetPO cmd(nullptr);
    static_cast<Ipc::CmdVLSvcBase&>(cmd).accept(static_cast<Ipc::CmdProcessorI&>(processor));
    EXPECT_THAT(processor.visited, IsEmpty());
    EXPECT_EQ(cmd.respErrMsg(), "The part \"po\" cannot be set here.");
}

TEST(SetPart, CopiesWithItsPayload) {
    Ipc::SetPO const cmd(nullptr, Cfg::Id("bob/acme"), po(R"({"code":"4711"})"));
    Ipc::SetPO const copy(cmd);
    EXPECT_EQ(copy.id(), 15);
    EXPECT_EQ(reqOf(copy), reqOf(cmd));
}

} // namespace
