// What all commands share: numbers, names, timeouts, dispatch, copies and the behaviour of their bases.

#include "tests/ipc/json_steps.h"
#include "tests/ipc/recording_processor.h"

#include "vlservice/platform/log.h"
#include "vlservice/vlservice.h"

#include <gmock/gmock.h>

#include <chrono>
#include <functional>
#include <type_traits>

using namespace testing;
using Ipc::Timeouts;
using Processor = std::shared_ptr<Ipc::CmdProcessorI>;

namespace {

struct CmdCase {
    std::string className;
    std::function<std::shared_ptr<Ipc::CmdVLSvcBase>(Processor)> makeEmpty;
    int id;
    std::string name;
    Timeouts::TimeoutId timeout;
    /// The operation that accept reaches.
    std::string visit;
};

template<typename Cmd>
CmdCase cmdCase(std::string className, int id, std::string name, Timeouts::TimeoutId timeout,
                std::string visit = {}) {
    if (visit.empty())
        visit = className;
    return {className, [](Processor p) { return std::make_shared<Cmd>(std::move(p)); }, id, name, timeout,
            visit};
}

constexpr auto DEFAULT = Timeouts::TIMEOUT_ID_1;
constexpr auto LONG = Timeouts::TIMEOUT_ID_3;

std::vector<CmdCase> allCmds() {
    return {
        cmdCase<Ipc::SetPartTmpl<Cfg::App, 10>>("SetApp", 10, "\"Set app\"", DEFAULT, "set app"),
        cmdCase<Ipc::SetPartTmpl<Cfg::Inet, 12>>("SetInet", 12, "\"Set inet\"", DEFAULT, "set inet"),
        cmdCase<Ipc::SetPartTmpl<Cfg::Presets, 13>>("SetPresets", 13, "\"Set presets\"", DEFAULT,
                                                    "set presets"),
        cmdCase<Ipc::SetPartTmpl<Cfg::Profiles, 14>>("SetProfiles", 14, "\"Set profiles\"", DEFAULT,
                                                     "set profiles"),
        cmdCase<Ipc::SetPartTmpl<Cfg::PO, 15>>("SetPO", 15, "\"Set po\"", DEFAULT, "set po"),
        cmdCase<Ipc::SetPartTmpl<Cfg::Departments, 16>>("SetDepartments", 16, "\"Set deps\"", DEFAULT,
                                                        "set deps"),
        cmdCase<Ipc::RemoveCfgNode>("RemoveCfgNode", 17, "Remove Cfg Node", DEFAULT),
        cmdCase<Ipc::CfgIdsForUser>("CfgIdsForUser", 18, "Config Ids For User", DEFAULT),
        cmdCase<Ipc::CfgIdsTree>("CfgIdsTree", 19, "Config Tree", DEFAULT),
        cmdCase<Ipc::UploadQueued>("UploadQueued", 20, "Upload Queued", DEFAULT),
        cmdCase<Ipc::UpdateStatus>("UpdateStatus", 21, "Update Status", LONG),
        cmdCase<Ipc::UpdateCfg>("UpdateCfg", 22, "Update Cfg", LONG),
        cmdCase<Ipc::PriceEst>("PriceEst", 24, "Price Estimate", LONG),
        cmdCase<Ipc::ProcessPack>("ProcessPack", 25, "Process Pack", DEFAULT),
        cmdCase<Ipc::GetSvcCfg>("GetSvcCfg", 26, "Get Service Cfg", DEFAULT),
        cmdCase<Ipc::SetSvcCfg>("SetSvcCfg", 27, "Set Service Cfg", DEFAULT),
        cmdCase<Ipc::GuiFwd>("GuiFwd", 28, "GUI Forward", DEFAULT),
        cmdCase<Ipc::CSConfigIdsList>("CSConfigIdsList", 29, "CSConfig Ids List", LONG),
        cmdCase<Ipc::CSConfigSrvChange>("CSConfigSrvChange", 30, "CSConfig Srv Change", LONG),
    };
}

class EveryCmd : public TestWithParam<CmdCase> {
protected:
    std::shared_ptr<PartSettingProcessor> processor = std::make_shared<PartSettingProcessor>();
    std::shared_ptr<Ipc::CmdVLSvcBase> cmd = GetParam().makeEmpty(processor);
};

TEST_P(EveryCmd, HasItsNumber) { EXPECT_EQ(cmd->id(), GetParam().id); }

TEST_P(EveryCmd, HasItsName) { EXPECT_EQ(cmd->name(), GetParam().name); }

TEST_P(EveryCmd, StatesItsTimeout) { EXPECT_EQ(cmd->reqTimeoutId(), GetParam().timeout); }

TEST_P(EveryCmd, KeepsTheProcessorItWasBuiltWith) { EXPECT_EQ(cmd->processor(), processor); }

TEST_P(EveryCmd, LetsTheNextRequestFollow) { EXPECT_TRUE(cmd->sendNextReqAfterDone()); }

TEST_P(EveryCmd, ReachesTheVisitOfItsOwnClassAndNoOther) {
    cmd->accept(static_cast<Ipc::CmdProcessorI&>(*processor));
    EXPECT_THAT(processor->visited, ElementsAre(GetParam().visit));
}

TEST_P(EveryCmd, ReachesTheSameVisitWithoutTheDetour) {
    cmd->accept(static_cast<Ipc::CmdProcessorVLSvcI&>(*processor));
    EXPECT_THAT(processor->visited, ElementsAre(GetParam().visit));
}

TEST_P(EveryCmd, IsMadeEmptyFromItsNumberUnlessItNeverTravels) {
    auto const made = Ipc::makeEmptyCmd(static_cast<unsigned char>(GetParam().id), processor);
    if (GetParam().className == "GuiFwd") {
        EXPECT_EQ(made, nullptr);
        return;
    }
    ASSERT_NE(made, nullptr);
    EXPECT_EQ(made->name(), GetParam().name);
    EXPECT_EQ(made->processor(), processor);
}

INSTANTIATE_TEST_SUITE_P(Cmds, EveryCmd, ValuesIn(allCmds()),
                         [](auto const& instance) { return instance.param.className; });

TEST(Commands, HaveNoOtherNumbers) {
    std::vector<int> known;
    for (CmdCase const& c : allCmds())
        known.push_back(c.id);
    for (int id = 0; id < 256; ++id) {
        bool const expected =
            id != Ipc::GuiFwd::CMD_ID && std::find(known.begin(), known.end(), id) != known.end();
        EXPECT_EQ(Ipc::makeEmptyCmd(static_cast<unsigned char>(id), nullptr) != nullptr, expected) << id;
    }
}

// --- copies

TEST(CopiedCommands, KeepNumberProcessorAndPayload) {
    auto const processor = std::make_shared<RecordingProcessor>();
    Ipc::ProcessPack const original(processor, "db:5984", "packs", "p1");
    Ipc::ProcessPack const copy(original);
    EXPECT_EQ(copy.id(), original.id());
    EXPECT_EQ(copy.processor(), processor);
    EXPECT_EQ(reqOf(copy), R"({"db_conn":"db:5984","db_name":"packs","id":"p1"})");
}

TEST(CopiedCommands, KeepTheResponse) {
    Ipc::UpdateCfg original(nullptr, Cfg::Id("bob/acme"), true);
    original.setResp("locked");
    Ipc::UpdateCfg const copy(original);
    EXPECT_EQ(reqOf(copy), reqOf(original));
    EXPECT_EQ(copy.respErrMsg(), "locked");
}

TEST(CopiedCommands, ShareTheObjectOfAWholePayload) {
    Ipc::PriceEst const original(nullptr, {{"sheets", 3}});
    Ipc::PriceEst const copy(original);
    EXPECT_EQ(copy.reqParams().node(), original.reqParams().node());
}

TEST(CopiedCommands, MayBeHeldBySharedPointersOfTheirOwn) {
    auto const original = std::make_shared<Ipc::CfgIdsTree>(nullptr);
    auto const copy = std::make_shared<Ipc::CfgIdsTree>(*original);
    EXPECT_EQ(copy->shared_from_this(), copy);
}

template<typename Cmd>
constexpr bool isCopyable = std::is_copy_constructible_v<Cmd>;

static_assert(isCopyable<Ipc::CfgIdsTree> && isCopyable<Ipc::CfgIdsForUser> &&
              isCopyable<Ipc::RemoveCfgNode> && isCopyable<Ipc::UpdateCfg> && isCopyable<Ipc::GetSvcCfg> &&
              isCopyable<Ipc::SetSvcCfg> && isCopyable<Ipc::CSConfigIdsList> &&
              isCopyable<Ipc::CSConfigSrvChange> && isCopyable<Ipc::PriceEst> &&
              isCopyable<Ipc::ProcessPack> && isCopyable<Ipc::UploadQueued> &&
              isCopyable<Ipc::UpdateStatus> && isCopyable<Ipc::GuiFwd> &&
              isCopyable<Ipc::SetPartTmpl<Cfg::App, 10>>);

// Only the commands themselves can be destroyed; a shared pointer to a base knows what it holds.
static_assert(!std::is_destructible_v<Ipc::CmdI> && !std::is_destructible_v<Ipc::JsonCmdBase> &&
              !std::is_destructible_v<Ipc::CmdVLSvcBase> && std::is_destructible_v<Ipc::UpdateCfg>);

// --- timeouts

TEST(Timeouts, HaveTheirDurations) {
    using namespace std::chrono_literals;
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_0), 0ms);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_1), 10s);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_2), 30s);
    EXPECT_EQ(Timeouts::duration(Timeouts::TIMEOUT_ID_3), 120s);
}

// --- commands without a payload carry nothing

TEST(CommandsWithoutAPayload, SerialiseToAnEmptyObject) {
    EXPECT_EQ(reqOf(Ipc::CfgIdsTree(nullptr)), "{}");
    EXPECT_EQ(reqOf(Ipc::GetSvcCfg(nullptr)), "{}");
    EXPECT_EQ(respOf(Ipc::SetSvcCfg(nullptr, {{"a", 1}})), "{}");
    EXPECT_EQ(respOf(Ipc::CSConfigSrvChange(nullptr)), "{}");
    EXPECT_EQ(respOf(Ipc::ProcessPack(nullptr, "h", "n", "p")), "{}");
    EXPECT_EQ(respOf(Ipc::UploadQueued(nullptr, "h", "n")), "{}");
    EXPECT_EQ(respOf(Ipc::UpdateStatus(nullptr, "h", "n")), "{}");
}

TEST(CommandsWithoutAPayload, ReadNothing) {
    Ipc::SetSvcCfg cmd(nullptr, {{"a", 1}});
    readResp(cmd, R"({"b":2})");
    EXPECT_EQ(text(cmd.req()), R"({"a":1})");
    Ipc::CfgIdsTree tree(nullptr);
    readReq(tree, R"({"b":2})");
    EXPECT_EQ(text(tree.resp()), "{}");
}

} // namespace
