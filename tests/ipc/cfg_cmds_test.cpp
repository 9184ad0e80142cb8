// The commands about configuration: their JSON in both directions.

#include "tests/ipc/json_steps.h"

#include "vlservice/ipc/cfg_ids_for_user.h"
#include "vlservice/ipc/cfg_ids_tree.h"
#include "vlservice/ipc/cs_config_ids_list.h"
#include "vlservice/ipc/cs_config_srv_change.h"
#include "vlservice/ipc/get_svc_cfg.h"
#include "vlservice/ipc/remove_cfg_node.h"
#include "vlservice/ipc/set_svc_cfg.h"
#include "vlservice/ipc/update_cfg.h"

#include <gmock/gmock.h>

using namespace testing;

namespace {

// --- CfgIdsTree, GetSvcCfg, SetSvcCfg, CSConfigIdsList: whole objects

template<typename Cmd>
class CmdAnsweringAnObject : public Test {};
using CmdsAnsweringAnObject = Types<Ipc::CfgIdsTree, Ipc::GetSvcCfg, Ipc::CSConfigIdsList>;
TYPED_TEST_SUITE(CmdAnsweringAnObject, CmdsAnsweringAnObject);

TYPED_TEST(CmdAnsweringAnObject, AnswersAnEmptyOneAtFirst) { EXPECT_EQ(respOf(TypeParam(nullptr)), "{}"); }

TYPED_TEST(CmdAnsweringAnObject, WritesTheVeryObjectThatWasSet) {
    TypeParam cmd(nullptr);
    json::Object const answer{{"x", 1}};
    cmd.setResp(answer);
    EXPECT_EQ(static_cast<Ipc::JsonCmdBase&>(cmd).serializeResp().node(), answer.node());
}

TYPED_TEST(CmdAnsweringAnObject, RefersToTheObjectThatWasReceived) {
    TypeParam cmd(nullptr);
    json::Object const received{{"x", 1}};
    static_cast<Ipc::JsonCmdBase&>(cmd).deserializeResp(received);
    EXPECT_EQ(cmd.resp().node(), received.node());
}

TEST(SetSvcCfg, CarriesItsObjectThere) {
    Ipc::SetSvcCfg const cmd(nullptr, {{"outbox", "/o"}});
    EXPECT_EQ(reqOf(cmd), R"({"outbox":"/o"})");
    Ipc::SetSvcCfg received(nullptr);
    EXPECT_EQ(text(received.req()), "{}");
    readReq(received, R"({"outbox":"/o"})");
    EXPECT_EQ(text(received.req()), R"({"outbox":"/o"})");
}

TEST(CSConfigIdsList, HasOneObjectForBothDirections) {
    Ipc::CSConfigIdsList cmd(nullptr, {{"q", 1}});
    EXPECT_EQ(reqOf(cmd), R"({"q":1})");
    cmd.setResp({{"a", 2}});
    EXPECT_EQ(text(cmd.reqParams()), R"({"a":2})");
    EXPECT_EQ(text(cmd.resp()), R"({"a":2})");
    Ipc::CSConfigIdsList received(nullptr);
    readReq(received, R"({"q":1})");
    EXPECT_EQ(text(received.reqParams()), R"({"q":1})");
}

// --- CfgIdsForUser

TEST(CfgIdsForUser, WithoutAUserIsAnEmptyObjectAndReadsBackAsEmpty) {
    EXPECT_EQ(reqOf(Ipc::CfgIdsForUser(nullptr, "")), "{}");
    Ipc::CfgIdsForUser received(nullptr, "bob");
    readReq(received, "{}");
    EXPECT_EQ(received.inclUser(), "");
}

TEST(CfgIdsForUser, CarriesTheUser) {
    EXPECT_EQ(reqOf(Ipc::CfgIdsForUser(nullptr, "bob")), R"({"inc_usr":"bob"})");
    Ipc::CfgIdsForUser received(nullptr);
    readReq(received, R"({"inc_usr":"bob"})");
    EXPECT_EQ(received.inclUser(), "bob");
}

TEST(CfgIdsForUser, ReadsAUserThatIsNoTextAsEmpty) {
    Ipc::CfgIdsForUser received(nullptr, "bob");
    readReq(received, R"({"inc_usr":7})");
    EXPECT_EQ(received.inclUser(), "");
}

TEST(CfgIdsForUser, WritesItsIdsInOrderAndDisabledOnlyWhenTrue) {
    Ipc::CfgIdsForUser cmd(nullptr);
    EXPECT_EQ(respOf(cmd), R"({"id_dtas":[]})");
    cmd.addToResp({"u=bob/a=acme", "Bob", false});
    cmd.addToResp({"", "", true});
    EXPECT_EQ(respOf(cmd),
              R"({"id_dtas":[{"id":"u=bob/a=acme","descr":"Bob"},{"id":"","descr":"","disabled":true}]})");
}

TEST(CfgIdsForUser, ReplacesTheListWhenItReadsAResponse) {
    Ipc::CfgIdsForUser cmd(nullptr);
    cmd.addToResp({"old", "old", false});
    readResp(cmd, R"({"id_dtas":[{"id":"a=acme","descr":"Acme","disabled":true},{"descr":"no id"}]})");
    ASSERT_EQ(cmd.resp().size(), 2u);
    EXPECT_EQ(cmd.resp()[0].id, "a=acme");
    EXPECT_EQ(cmd.resp()[0].description, "Acme");
    EXPECT_TRUE(cmd.resp()[0].disabled);
    EXPECT_EQ(cmd.resp()[1].id, "");
    EXPECT_FALSE(cmd.resp()[1].disabled);
}

TEST(CfgIdsForUser, ReadsDisabledAsAFlag) {
    Ipc::CfgIdsForUser cmd(nullptr);
    readResp(cmd, R"({"id_dtas":[{"descr":"","disabled":1},{"descr":"","disabled":false}]})");
    EXPECT_FALSE(cmd.resp()[0].disabled);
    EXPECT_FALSE(cmd.resp()[1].disabled);
}

struct BadResponse {
    char const* name;
    char const* response;
    char const* message;
};

class CfgIdsForUserRefusing : public TestWithParam<BadResponse> {};

TEST_P(CfgIdsForUserRefusing, NamesBothTypes) {
    Ipc::CfgIdsForUser cmd(nullptr);
    cmd.addToResp({"kept", "kept", false});
    EXPECT_EQ(jsonError([&] { readResp(cmd, GetParam().response); }), GetParam().message);
    ASSERT_EQ(cmd.resp().size(), 1u);
    EXPECT_EQ(cmd.resp()[0].id, "kept");
}

INSTANTIATE_TEST_SUITE_P(
    Responses, CfgIdsForUserRefusing,
    Values(BadResponse{"NoIds", "{}", "JSON error: Wrong type: empty. Expected type: array"},
           BadResponse{"IdsAreAnObject", R"({"id_dtas":{}})",
                       "JSON error: Wrong type: object. Expected type: array"},
           BadResponse{"ElementIsAText", R"({"id_dtas":["x"]})",
                       "JSON error: Wrong type: string. Expected type: object"},
           BadResponse{"ElementIsNull", R"({"id_dtas":[null]})",
                       "JSON error: Wrong type: null. Expected type: object"},
           BadResponse{"NoDescription", R"({"id_dtas":[{"id":"a=acme"}]})",
                       "JSON error: Wrong type: empty. Expected type: string"},
           BadResponse{"SecondDescriptionIsANumber", R"({"id_dtas":[{"descr":"a"},{"descr":1.5}]})",
                       "JSON error: Wrong type: float. Expected type: string"}),
    [](auto const& instance) { return instance.param.name; });

// --- RemoveCfgNode

TEST(RemoveCfgNode, AlwaysWritesItsId) {
    EXPECT_EQ(reqOf(Ipc::RemoveCfgNode(nullptr, Cfg::Id("bob/acme"))), R"({"id":"u=bob/a=acme"})");
    EXPECT_EQ(reqOf(Ipc::RemoveCfgNode(nullptr, Cfg::Id(""))), R"({"id":""})");
    EXPECT_EQ(reqOf(Ipc::RemoveCfgNode(nullptr)), R"({"id":"/"})");
}

TEST(RemoveCfgNode, TakesAReceivedIdAsItStands) {
    Ipc::RemoveCfgNode cmd(nullptr);
    readReq(cmd, R"({"id":"bob//x"})");
    EXPECT_EQ(cmd.cfgId().str(), "bob//x");
    readReq(cmd, R"({"id":5})");
    EXPECT_EQ(cmd.cfgId().str(), "");
}

TEST(RemoveCfgNode, WritesNothingOnSuccess) {
    Ipc::RemoveCfgNode cmd(nullptr);
    EXPECT_EQ(respOf(cmd), "{}");
    Ipc::RemoveCfgNode received(nullptr);
    received.setResp("old");
    readResp(received, "{}");
    EXPECT_TRUE(received.removedOK());
    EXPECT_EQ(received.resp(), "");
}

TEST(RemoveCfgNode, CarriesTheErrorBack) {
    Ipc::RemoveCfgNode cmd(nullptr);
    cmd.setResp("The node has children.");
    EXPECT_EQ(respOf(cmd), R"({"err":"The node has children."})");
    Ipc::RemoveCfgNode received(nullptr);
    readResp(received, respOf(cmd));
    EXPECT_FALSE(received.removedOK());
    EXPECT_EQ(received.resp(), "The node has children.");
}

TEST(RemoveCfgNode, ReadsAnErrorThatIsNoTextAsSuccess) {
    Ipc::RemoveCfgNode cmd(nullptr);
    readResp(cmd, R"({"err":true})");
    EXPECT_TRUE(cmd.removedOK());
}

// --- UpdateCfg

TEST(UpdateCfg, WritesTheResetFlagOnlyWhenItIsSet) {
    EXPECT_EQ(reqOf(Ipc::UpdateCfg(nullptr, Cfg::Id("bob/acme"), false)), R"({"cfg_id":"u=bob/a=acme"})");
    EXPECT_EQ(reqOf(Ipc::UpdateCfg(nullptr, Cfg::Id("bob/acme"), true)),
              R"({"cfg_id":"u=bob/a=acme","reset_cfg":true})");
}

TEST(UpdateCfg, SetsTheFlagByJsonTrueAlone) {
    std::pair<char const*, bool> const cases[] = {
        {R"({"reset_cfg":true})", true},
        {R"({"reset_cfg":false})", false},
        {R"({"reset_cfg":1})", false},
        {R"({"reset_cfg":"true"})", false},
        {"{}", false},
    };
    for (auto const& [request, expected] : cases) {
        Ipc::UpdateCfg cmd(nullptr, Cfg::Id(), true);
        readReq(cmd, request);
        EXPECT_EQ(cmd.resetCfg(), expected) << request;
    }
}

TEST(UpdateCfg, ReadsItsIdLeniently) {
    Ipc::UpdateCfg cmd(nullptr);
    readReq(cmd, R"({"cfg_id":"a=acme"})");
    EXPECT_EQ(cmd.cfgId().str(), "a=acme");
    readReq(cmd, R"({"id":"a=acme"})");
    EXPECT_EQ(cmd.cfgId().str(), "");
}

TEST(UpdateCfg, CarriesTheErrorBack) {
    Ipc::UpdateCfg cmd(nullptr);
    EXPECT_EQ(respOf(cmd), "{}");
    EXPECT_TRUE(cmd.respOK());
    cmd.setResp("No such node.");
    EXPECT_EQ(respOf(cmd), R"({"err":"No such node."})");
    Ipc::UpdateCfg received(nullptr);
    readResp(received, respOf(cmd));
    EXPECT_FALSE(received.respOK());
    EXPECT_EQ(received.respErrMsg(), "No such node.");
    readResp(received, "{}");
    EXPECT_TRUE(received.respOK());
}

// --- CSConfigSrvChange

using SuspendType = Ipc::CSConfigSrvChange::SuspendType;

TEST(CSConfigSrvChange, WritesNothingForZero) {
    EXPECT_EQ(reqOf(Ipc::CSConfigSrvChange(nullptr)), "{}");
    EXPECT_EQ(reqOf(Ipc::CSConfigSrvChange(nullptr, SuspendType::None)), "{}");
}

TEST(CSConfigSrvChange, CarriesNumbersWithoutANameAsTheyAre) {
    EXPECT_EQ(reqOf(Ipc::CSConfigSrvChange(nullptr, static_cast<SuspendType>(-3))), R"({"susp_type":-3})");
}

TEST(CSConfigSrvChange, ReadsWhatIsNoIntegerAsZero) {
    std::pair<char const*, int> const cases[] = {
        {R"({"susp_type":2})", 2},    {R"({"susp_type":"2"})", 0},        {R"({"susp_type":2.0})", 0},
        {R"({"susp_type":true})", 0}, {R"({"susp_type":4294967298})", 2}, {"{}", 0},
    };
    for (auto const& [request, expected] : cases) {
        Ipc::CSConfigSrvChange cmd(nullptr, static_cast<SuspendType>(9));
        readReq(cmd, request);
        EXPECT_EQ(static_cast<int>(cmd.suspend()), expected) << request;
    }
}

} // namespace
